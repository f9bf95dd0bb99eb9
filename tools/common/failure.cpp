// The tools' failure reports: kind, library error code and the what/meaning/advice message.
#include "failure.h"

#include <algorithm>
#include <iterator>

#include "busy.h"
#include "fileindex/error.h"

namespace fileindex_tool {

using VEXO::FILEINDEX::ErrorHandler;

namespace {

struct ErrorText {
    int code;
    const char *name;
    FailureKind kind;
    const char *meaning;
    const char *advice;
};

const ErrorText kErrorTexts[] = {
    {1, "FILEIDX_ERR_BAD_PARAM", FailureKind::kFailed,
     "the library refused the request (a missing or wrongly typed member, an unknown key, a negative pause "
     "length)",
     "check the arguments"},
    {2, "FILEIDX_ERR_PATH", FailureKind::kNotFound, "a path or share could not be resolved through the share "
                                                    "database",
     "check that the share exists and that the path is /<share>/<folder>"},
    {4, "FILEIDX_ERR_NO_SUCH_FOLDER", FailureKind::kNotFound, "the folder is not in the folder list",
     "the folder list shows the indexed folders"},
    {5, "FILEIDX_ERR_EXCEED_MAX_FOLDER", FailureKind::kFailed, "the folder list already holds 1000 folders",
     "remove folders before adding more"},
    {6, "FILEIDX_ERR_LOAD_CONFIG", FailureKind::kFailed,
     "folder.conf or status.conf exists but cannot be read or parsed, or a member of status.conf has the wrong type",
     "the system log names the file, or says \"json exception\" for a member of status.conf; repair or remove it"},
    {7, "FILEIDX_ERR_SAVE_CONFIG", FailureKind::kFailed, "folder.conf or status.conf could not be written",
     "check free space and permissions of the configuration directory"},
    {8, "FILEIDX_ERR_MALFORMED_CONFIG", FailureKind::kFailed, "folder.conf is not a JSON object",
     "repair or remove folder.conf"},
    {9, "FILEIDX_ERR_LOCK", FailureKind::kBusy, "another process holds the folder list or status lock",
     "retry in a moment"},
};

const ErrorText *FindText(int code)
{
    const auto text = std::find_if(std::begin(kErrorTexts), std::end(kErrorTexts),
                                   [code](const ErrorText &entry) { return entry.code == code; });
    return text == std::end(kErrorTexts) ? nullptr : text;
}

}  // namespace

const char *ErrorCodeName(int code)
{
    const ErrorText *text = FindText(code);
    return text == nullptr ? nullptr : text->name;
}

Failure LibraryFailure(const std::string &what, const std::string &withoutCode)
{
    const int code = ErrorHandler::GetError();
    if (code == VEXO::FILEINDEX::FILEIDX_ERR_NONE) {
        return ToolFailure(FailureKind::kFailed, Failure::kNoCode, what + ": " + withoutCode);
    }
    const ErrorText *text = FindText(code);
    if (text == nullptr) {
        return ToolFailure(FailureKind::kFailed, code,
                           what + ": the library reported error code " + std::to_string(code) +
                               ", which this program does not know; the system log has the library's line");
    }
    Failure unusable;
    if (code == VEXO::FILEINDEX::FILEIDX_ERR_LOCK && LockFileUnusable(what, nullptr, unusable)) {
        return unusable;
    }
    return ToolFailure(text->kind, code, what + ": " + text->meaning + "; " + text->advice);
}

Failure ToolFailure(FailureKind kind, int code, const std::string &message)
{
    Failure failure;
    failure.kind = kind;
    failure.code = code;
    failure.message = message;
    return failure;
}

void ClearLastError()
{
    ErrorHandler::SetError(VEXO::FILEINDEX::FILEIDX_ERR_NONE);
}

Json::Value ErrorObject(const Failure &failure)
{
    Json::Value error;
    const char *name = ErrorCodeName(failure.code);
    error["code"] = failure.code == Failure::kNoCode ? Json::Value() : Json::Value(failure.code);
    error["name"] = name == nullptr ? Json::Value() : Json::Value(name);
    error["message"] = failure.message;
    Json::Value document;
    document["error"] = error;
    return document;
}

}  // namespace fileindex_tool
