#include "output.h"

#include <algorithm>
#include <cstdio>
#include <iostream>
#include <memory>

#include <json/writer.h>

#include "fileindex/error.h"

namespace fileindexctl {

using VEXO::FILEINDEX::ErrorHandler;

namespace {

struct ErrorText {
    int code;
    const char *name;
    const char *meaning;
    const char *advice;
};

const ErrorText kErrorTexts[] = {
    {0, "FILEIDX_ERR_NONE", "the library recorded no reason", "its log line is in the system log"},
    {1, "FILEIDX_ERR_BAD_PARAM",
     "a request was malformed (a missing or wrongly typed member, an unknown key, a negative pause length)",
     "check the arguments"},
    {2, "FILEIDX_ERR_PATH", "a path or share could not be resolved through the share database",
     "check that the share exists and that the path is /<share>/<folder>"},
    {4, "FILEIDX_ERR_NO_SUCH_FOLDER", "the folder is not in the folder list",
     "'fileindexctl folder list' shows the indexed folders"},
    {5, "FILEIDX_ERR_EXCEED_MAX_FOLDER", "the folder list already holds 1000 folders",
     "remove folders before adding more"},
    {6, "FILEIDX_ERR_LOAD_CONFIG", "folder.conf or status.conf exists but cannot be read or parsed",
     "the system log names the file; repair or remove it"},
    {7, "FILEIDX_ERR_SAVE_CONFIG", "folder.conf or status.conf could not be written",
     "check free space and permissions of the configuration directory"},
    {8, "FILEIDX_ERR_MALFORMED_CONFIG", "folder.conf is not a JSON object", "repair or remove folder.conf"},
    {9, "FILEIDX_ERR_LOCK", "another process holds the folder list or status lock", "retry in a moment"},
};

// Characters of UTF-8 text: every byte but continuation bytes.
size_t DisplayWidth(const std::string &text)
{
    return static_cast<size_t>(
        std::count_if(text.begin(), text.end(), [](char c) { return (static_cast<unsigned char>(c) & 0xC0) != 0x80; }));
}

}  // namespace

void PrintJson(const Json::Value &document)
{
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "  ";
    builder["emitUTF8"] = true;
    std::cout << Json::writeString(builder, document) << "\n";
}

Table::Table(std::vector<std::string> header)
{
    m_rows.push_back(std::move(header));
}

void Table::Add(std::vector<std::string> row)
{
    m_rows.push_back(std::move(row));
}

void Table::Print(std::ostream &out) const
{
    std::vector<size_t> widths;
    for (const std::vector<std::string> &row : m_rows) {
        widths.resize(std::max(widths.size(), row.size()));
        for (size_t i = 0; i < row.size(); ++i) {
            widths[i] = std::max(widths[i], DisplayWidth(row[i]));
        }
    }
    for (const std::vector<std::string> &row : m_rows) {
        std::string line;
        for (size_t i = 0; i < row.size(); ++i) {
            line += row[i];
            if (i + 1 < row.size()) {
                line.append(widths[i] - DisplayWidth(row[i]) + 2, ' ');
            }
        }
        out << line << "\n";
    }
}

std::string YesNo(bool value)
{
    return value ? "yes" : "no";
}

void ClearLastError()
{
    ErrorHandler::SetError(VEXO::FILEINDEX::FILEIDX_ERR_NONE);
}

int Fail(const std::string &what, const std::string &hintWithoutCode)
{
    const int code = ErrorHandler::GetError();
    const auto text = std::find_if(std::begin(kErrorTexts), std::end(kErrorTexts),
                                   [code](const ErrorText &entry) { return entry.code == code; });
    std::cout.flush();
    if (text == std::end(kErrorTexts)) {
        std::cerr << "fileindexctl: " << what << " failed: error " << code << ": unknown error code\n";
    } else {
        const char *advice = code == 0 && !hintWithoutCode.empty() ? hintWithoutCode.c_str() : text->advice;
        std::cerr << "fileindexctl: " << what << " failed: error " << code << " " << text->name << ": "
                  << text->meaning << "; " << advice << "\n";
    }
    return kFailure;
}

}  // namespace fileindexctl
