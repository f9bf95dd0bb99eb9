// What fileindexctl prints: tables and lines for people, one JSON document for scripts, and the
// report of a failure, with the exit statuses that tell failures apart.
#ifndef FILEINDEXCTL_OUTPUT_H
#define FILEINDEXCTL_OUTPUT_H

#include <iostream>
#include <string>
#include <vector>

#include <json/value.h>

#include "commands.h"
#include "failure.h"

namespace fileindexctl {

// Exit statuses.
constexpr int kSuccess = 0;
constexpr int kFailure = 1;         // a library call failed
constexpr int kUsage = 2;           // the command line is wrong, or a path or value in it
constexpr int kRefused = 3;         // check: a path may not be indexed; folder add/set: refused for that
constexpr int kNotFound = 4;        // no such share, path or folder
constexpr int kDaemonNotTold = 5;   // fileindexd was not told; the message says what stands
constexpr int kBusy = 75;           // a lock stayed busy until --wait ran out (sysexits' EX_TEMPFAIL)
constexpr int kInterrupted = 130;

// One JSON document on standard output, indented. The tool's records hold valid UTF-8 only (byte
// strings come as the pairs of path_encoding.h).
void PrintJson(const Json::Value &document);

// Reports the failure: "fileindexctl: <message> (<error code name>)" on standard error (without the
// name when no code applies) and, with --json, the error object on standard output. Returns the exit status of the failure's kind.
int Report(const Context &context, const fileindex_tool::Failure &failure);

// Columns aligned to their widest cell, counted in characters of UTF-8 text. Cells that come from
// files (paths, names) must have gone through TerminalText.
class Table {
public:
    explicit Table(std::vector<std::string> header);
    void Add(std::vector<std::string> row);
    void Print(std::ostream &out = std::cout) const;

private:
    std::vector<std::vector<std::string>> m_rows;
};

std::string YesNo(bool value);

}  // namespace fileindexctl

#endif
