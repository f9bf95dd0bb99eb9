// What went wrong, as fileindexctl and the panel both report it: a kind (which decides fileindexctl's
// exit status and the panel's HTTP status), the library's error code where one applies, and one
// message "<what failed>: <what it means>; <what to try>". Never a bare number, and never error 0
// as a reason: where the library recorded no code, the message says what is known instead.
//
// As JSON: {"error": {"code": N, "name": "FILEIDX_ERR_...", "message": "..."}}, "code" and "name"
// null when no code applies. Messages quote paths and names with TerminalText, so that they are
// valid UTF-8 and safe on a terminal.
#ifndef FILEINDEX_TOOL_FAILURE_H
#define FILEINDEX_TOOL_FAILURE_H

#include <string>

#include <json/value.h>

namespace fileindex_tool {

enum class FailureKind {
    kFailed,         // a library call failed for a reason other than those below
    kInvalid,        // the request is wrong: a malformed path, a value out of range, nothing to change
    kNotFound,       // no such share, path or folder
    kRefused,        // a path that may not be indexed; the message names the rule
    kDaemonNotTold,  // the files were changed, but fileindexd did not take the command
    kBusy,           // another process held a configuration lock until the caller gave up
};

struct Failure {
    FailureKind kind = FailureKind::kFailed;
    int code = kNoCode;  // the library's error code, or the one that names the condition; kNoCode if none
    std::string message;

    static constexpr int kNoCode = -1;
};

// "FILEIDX_ERR_LOCK" for 9, ...; nullptr for FILEIDX_ERR_NONE and for a number the library does
// not define.
const char *ErrorCodeName(int code);

// The failure of a library call that returned false, read from the library's last error (clear it
// with ClearLastError before the call): "<what>: <meaning>; <advice>", of the kind the code implies
// (9 busy, 2 and 4 not found, others failed); 9 for a lock file that cannot be opened or created
// is the ordinary failure of LockFileUnusable (busy.h). When the library recorded no code, the message is
// "<what>: <withoutCode>" and the failure is of kind kFailed without a code: withoutCode says what
// the caller knows (which steps set no code, what to look at).
Failure LibraryFailure(const std::string &what, const std::string &withoutCode);

// A failure the caller found itself, before or instead of a library call. code is the library's
// code for the same condition (2 for an unknown share or path, 4 for a folder not in the list), or
// kNoCode.
Failure ToolFailure(FailureKind kind, int code, const std::string &message);

// Stores FILEIDX_ERR_NONE as the library's last error, so that a failing call that follows leaves
// its own code there and not one from an earlier failure.
void ClearLastError();

// {"error": {"code": N, "name": "...", "message": "..."}}.
Json::Value ErrorObject(const Failure &failure);

}  // namespace fileindex_tool

#endif
