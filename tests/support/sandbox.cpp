// The tests' sandbox appliance under the build's root, made afresh for every test.
#include "tests/support/sandbox.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fstream>
#include <sstream>

#include "config/file_io.h"
#include "config/json_io.h"
#include "tests/support/log_capture.h"

namespace fileindex_test {

std::vector<std::pair<std::string, std::string>> SandboxTest::s_shares;

namespace {

const std::string kRoot = FILEINDEX_ROOT_DIR;

}  // namespace

std::string ReadFile(const std::string &path)
{
    std::string content;
    VEXO::FILEINDEX::ReadWholeFile(path, content);
    return content;
}

void WriteFile(const std::string &path, const std::string &content)
{
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << content;
    ASSERT_TRUE(out.good()) << path;
}

Json::Value ParseJson(const std::string &text)
{
    Json::Value value;
    EXPECT_TRUE(VEXO::FILEINDEX::fromString(value, text)) << text;
    return value;
}

bool IsLockHeld(const std::string &lockPath)
{
    const int fd = open(lockPath.c_str(), O_RDWR | O_CLOEXEC);
    const bool held = fd >= 0 && flock(fd, LOCK_EX | LOCK_NB) != 0;
    if (fd >= 0) {
        close(fd);
    }
    return held;
}

void SandboxTest::SetUp()
{
    ASSERT_FALSE(kRoot.empty()) << "tests need a sandbox root";
    umask(0);
    stdfs::create_directories(kRoot);
    for (const stdfs::directory_entry &entry : stdfs::directory_iterator(kRoot)) {
        stdfs::remove_all(entry.path());
    }
    s_shares.clear();
    for (const char *file : {FILEINDEX_APPLIANCE_FILES}) {
        stdfs::create_directories(stdfs::path(file).parent_path());
    }
    stdfs::create_directories(FILEINDEX_EMULATION_STATE_DIR);
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
        stdfs::create_directories(path);
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
    WriteFile(StatePath("shares.json"), VEXO::FILEINDEX::toString(database));
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

std::string SandboxTest::StatePath(const std::string &name)
{
    return FILEINDEX_EMULATION_STATE_DIR "/" + name;
}

void SandboxTest::SetFaults(const Json::Value &faults)
{
    WriteFile(StatePath("faults.json"), VEXO::FILEINDEX::toString(faults));
}

std::vector<Json::Value> SandboxTest::Journal(const std::string &op)
{
    std::vector<Json::Value> entries;
    std::istringstream lines(ReadFile(StatePath("journal.jsonl")));
    for (std::string line; std::getline(lines, line);) {
        const Json::Value entry = ParseJson(line);
        if (op.empty() || entry["op"].asString() == op) {
            entries.push_back(entry);
        }
    }
    return entries;
}

}  // namespace fileindex_test
