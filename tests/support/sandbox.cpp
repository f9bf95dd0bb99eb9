#include "tests/support/sandbox.h"

#include <ftw.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fstream>
#include <sstream>

#include <json/reader.h>
#include <json/writer.h>

#include "tests/support/log_capture.h"

namespace fileindex_test {

std::vector<std::pair<std::string, std::string>> SandboxTest::s_shares;

namespace {

const std::string kRoot = FILEINDEX_ROOT_DIR;
const std::string kStateDir = FILEINDEX_EMULATION_STATE_DIR;

int RemoveEntry(const char *path, const struct stat *, int, struct FTW *ftw)
{
    if (ftw->level > 0) {
        remove(path);
    }
    return 0;
}

void WipeRoot()
{
    ASSERT_FALSE(kRoot.empty()) << "tests need a sandbox root";
    nftw(kRoot.c_str(), RemoveEntry, 32, FTW_DEPTH | FTW_PHYS);
}

std::string Compact(const Json::Value &value)
{
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, value);
}

}  // namespace

std::string ReadFile(const std::string &path)
{
    std::ifstream in(path, std::ios::binary);
    std::ostringstream content;
    content << in.rdbuf();
    return content.str();
}

void WriteFile(const std::string &path, const std::string &content)
{
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << content;
    ASSERT_TRUE(out.good()) << path;
}

bool PathExists(const std::string &path)
{
    struct stat st;
    return lstat(path.c_str(), &st) == 0;
}

void MakeDirs(const std::string &path)
{
    for (size_t slash = path.find('/', 1); ; slash = path.find('/', slash + 1)) {
        mkdir(path.substr(0, slash).c_str(), 0755);
        if (slash == std::string::npos) {
            break;
        }
    }
}

Json::Value ParseJson(const std::string &text)
{
    Json::CharReaderBuilder builder;
    std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value value;
    std::string errors;
    EXPECT_TRUE(reader->parse(text.data(), text.data() + text.size(), &value, &errors)) << errors << text;
    return value;
}

void SandboxTest::SetUp()
{
    WipeRoot();
    s_shares.clear();
    MakeDirs(HostPath("/tmp"));
    MakeDirs(HostPath("/usr/vexo/etc/fileindex"));
    MakeDirs(HostPath("/usr/vexo/bin"));
    MakeDirs(HostPath("/var/run"));
    MakeDirs(kStateDir);
    // The administrators' notification tool: succeeds and does nothing.
    WriteFile(FILEINDEX_NOTIFY_TOOL_PATH, "#!/bin/sh\nexit 0\n");
    chmod(FILEINDEX_NOTIFY_TOOL_PATH, 0755);
    LogCapture::Clear();
}

void SandboxTest::DeclareShares(const std::string &declaration)
{
    Json::Value database(Json::arrayValue);
    std::istringstream words(declaration);
    std::string word;
    while (words >> word) {
        std::istringstream parts(word);
        std::string location;
        std::getline(parts, location, '+');
        const size_t slash = location.find('/');
        ASSERT_NE(slash, std::string::npos) << "expected volume/share, got " << word;
        const std::string name = location.substr(slash + 1);
        const std::string path = HostPath("/" + location);
        MakeDirs(path);
        s_shares.emplace_back(name, path);

        Json::Value share;
        share["name"] = name;
        share["path"] = path;
        std::string flag;
        while (std::getline(parts, flag, '+')) {
            share[flag] = true;
        }
        database.append(share);
    }
    WriteFile(kStateDir + "/shares.json", Compact(database));
}

std::string SandboxTest::SharePath(const std::string &share)
{
    for (const auto &entry : s_shares) {
        if (entry.first == share) {
            return entry.second;
        }
    }
    ADD_FAILURE() << "share not declared: " << share;
    return std::string();
}

std::string SandboxTest::HostPath(const std::string &appliancePath)
{
    return kRoot + appliancePath;
}

void SandboxTest::SetFaults(const Json::Value &faults)
{
    WriteFile(kStateDir + "/faults.json", Compact(faults));
}

std::vector<Json::Value> SandboxTest::Journal()
{
    std::vector<Json::Value> entries;
    std::istringstream lines(ReadFile(kStateDir + "/journal.jsonl"));
    std::string line;
    while (std::getline(lines, line)) {
        entries.push_back(ParseJson(line));
    }
    return entries;
}

std::vector<Json::Value> SandboxTest::JournalOf(const std::string &op)
{
    std::vector<Json::Value> entries;
    for (const Json::Value &entry : Journal()) {
        if (entry["op"].asString() == op) {
            entries.push_back(entry);
        }
    }
    return entries;
}

}  // namespace fileindex_test
