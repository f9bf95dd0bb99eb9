// The panel's access token: 32 bytes from the kernel's random source, kept as 64 lower-case hex
// digits in a file only its owner may read.
#ifndef FILEINDEX_PANEL_TOKEN_H
#define FILEINDEX_PANEL_TOKEN_H

#include <string>

namespace fileindex_panel {

// Reads the token from path, or makes a new one there when nothing is at path (the file is created
// with mode 0600, never through a symbolic link). Refused, with a sentence for the administrator in
// problem: a symbolic link, anything but a regular file, a file another user owns or that group or
// others may read or write, and contents that are not one token.
bool LoadOrCreateToken(const std::string &path, std::string &token, std::string &problem);

// Compares a presented token with the real one in time that depends only on the presented length,
// so that a client cannot find the token a digit at a time by timing the answers.
bool TokenMatches(const std::string &presented, const std::string &token);

}  // namespace fileindex_panel

#endif
