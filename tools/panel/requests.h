// What the API's requests may hold, read strictly: anything else is a 400 with a sentence saying what
// was wrong, before any library call. None of these call the library.
#ifndef FILEINDEX_PANEL_REQUESTS_H
#define FILEINDEX_PANEL_REQUESTS_H

#include <string>
#include <vector>

#include <json/value.h>

namespace fileindex_panel {

// Requests carry at most this many folders or paths: the folder list's own limit.
constexpr unsigned kMaxRequestElements = 1000;

// Parses a request body: one JSON value, no comments, no duplicate member names, no text after it.
bool ParseBody(const std::string &body, Json::Value &value, std::string &problem);

// A path as a request gives it: a string, or an object with "path" (UTF-8 text) or "path_bytes"
// (the exact bytes, percent-encoded as the records give them), "path_bytes" winning when both are
// there, as when a record from the API is sent back. The path must begin with "/" and hold no NUL.
bool ReadPath(const Json::Value &element, std::string &path, std::string &problem);

// A non-empty array of at most kMaxRequestElements paths, each as ReadPath reads it.
bool ReadPaths(const Json::Value &body, std::vector<std::string> &paths, std::string &problem);

// The body of POST /api/v1/folders: a non-empty array of folder settings, each an object with a
// path (as ReadPath), optionally "name" (a string) and "document", "audio", "video", "photo"
// (booleans), and no other member. settings becomes the library's request (the paths decoded into
// "path"), paths the paths in request order.
bool ReadFolderSettings(const Json::Value &body, Json::Value &settings, std::vector<std::string> &paths,
                        std::string &problem);

// A query parameter holding a whole number from 0 to max; empty text gives fallback.
bool ReadCount(const std::string &text, unsigned long fallback, unsigned long max, unsigned long &count);

}  // namespace fileindex_panel

#endif
