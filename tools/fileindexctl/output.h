// What fileindexctl prints: tables and lines for people, one JSON document for scripts, and the
// one line on standard error that names the library's error code when a call fails.
#ifndef FILEINDEXCTL_OUTPUT_H
#define FILEINDEXCTL_OUTPUT_H

#include <iostream>
#include <string>
#include <vector>

#include <json/value.h>

namespace fileindexctl {

// Exit statuses.
constexpr int kSuccess = 0;
constexpr int kFailure = 1;      // a library call failed; its error line is on standard error
constexpr int kUsage = 2;        // the command line was wrong
constexpr int kInterrupted = 130;

// One JSON document on standard output, indented, string bytes copied raw (paths that are not
// valid UTF-8 come out as they are stored).
void PrintJson(const Json::Value &document);

// Columns aligned to their widest cell, counted in characters of UTF-8 text.
class Table {
public:
    explicit Table(std::vector<std::string> header);
    void Add(std::vector<std::string> row);
    void Print(std::ostream &out = std::cout) const;

private:
    std::vector<std::vector<std::string>> m_rows;
};

std::string YesNo(bool value);

// Stores FILEIDX_ERR_NONE as the library's last error, so that a failing call that follows leaves
// its own code there and not one from an earlier failure.
void ClearLastError();

// What to try when a status change was saved but its daemon command was not taken.
constexpr char kDaemonHint[] =
    "the change is saved, but fileindexd did not take the command: is the indexing service running? Retry once it is";

// Prints "fileindexctl: <what> failed: error <n> <NAME>: <meaning>; <advice>" on standard error and
// returns kFailure. When the library recorded no code, hintWithoutCode (if given) stands in for
// the general advice to read the system log.
int Fail(const std::string &what, const std::string &hintWithoutCode = std::string());

}  // namespace fileindexctl

#endif
