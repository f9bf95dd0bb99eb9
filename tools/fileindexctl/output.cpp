// fileindexctl's printing: human tables and lines, the --json document, failures and exit statuses.
#include "output.h"

#include <algorithm>
#include <iostream>

#include <json/writer.h>

namespace fileindexctl {

using fileindex_tool::Failure;
using fileindex_tool::FailureKind;

namespace {

// Characters of UTF-8 text: every byte but continuation bytes.
size_t DisplayWidth(const std::string &text)
{
    return static_cast<size_t>(
        std::count_if(text.begin(), text.end(), [](char c) { return (static_cast<unsigned char>(c) & 0xC0) != 0x80; }));
}

int ExitStatus(FailureKind kind)
{
    switch (kind) {
    case FailureKind::kInvalid: return kUsage;
    case FailureKind::kNotFound: return kNotFound;
    case FailureKind::kRefused: return kRefused;
    case FailureKind::kDaemonNotTold: return kDaemonNotTold;
    case FailureKind::kBusy: return kBusy;
    case FailureKind::kFailed: break;
    }
    return kFailure;
}

}  // namespace

void PrintJson(const Json::Value &document)
{
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "  ";
    builder["emitUTF8"] = true;
    std::cout << Json::writeString(builder, document) << "\n";
}

int Report(const Context &context, const Failure &failure)
{
    if (context.json) {
        PrintJson(fileindex_tool::ErrorObject(failure));
    }
    std::cout.flush();
    const char *name = fileindex_tool::ErrorCodeName(failure.code);
    std::cerr << "fileindexctl: " << failure.message << (name == nullptr ? "" : std::string(" (") + name + ")")
              << "\n";
    return ExitStatus(failure.kind);
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

}  // namespace fileindexctl
