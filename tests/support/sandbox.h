// A fresh appliance under the build's sandbox root for every test: the directories of the fixed
// appliance files, the emulated platform's state directory, and the volumes and shares a test
// declares. Every file mode a test reads is the one the code asked for: the umask is 0.
#ifndef FILEINDEX_TESTS_SANDBOX_H
#define FILEINDEX_TESTS_SANDBOX_H

#include <filesystem>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <json/value.h>

#include "appliance_paths.h"

namespace fileindex_test {

namespace stdfs = std::filesystem;

class SandboxTest : public ::testing::Test {
protected:
    void SetUp() override;

    // Declares shares in one line of "volume/share" words, each optionally followed by flags:
    // "volume1/photo volume1/video volume2/vault+encrypted+uses_encryption+read_only".
    // Creates the share directories and writes the emulated share database.
    void DeclareShares(const std::string &declaration);

    // <root>/<volume>/<share> of a declared share.
    static std::string SharePath(const std::string &share);
    // Root-prefixed host path of an appliance path such as "/volume1/photo".
    static std::string HostPath(const std::string &appliancePath);
    // <state directory>/<name>: a file of the emulated platform's state.
    static std::string StatePath(const std::string &name);

    // Forces platform results through the emulation's faults.json.
    static void SetFaults(const Json::Value &faults);
    // The emulation's journal, one object per side-effecting platform call (of the operation op
    // only, when op is given).
    static std::vector<Json::Value> Journal(const std::string &op = std::string());

private:
    static std::vector<std::pair<std::string, std::string>> s_shares;
};

// Small file helpers for assertions. WriteFile writes in place (truncate and write), as a script
// editing the file would; ReadFile gives "" for a file that cannot be read.
std::string ReadFile(const std::string &path);
void WriteFile(const std::string &path, const std::string &content);
Json::Value ParseJson(const std::string &text);  // fails the test on anything but strict JSON text
// True when some descriptor holds a flock on the lock file (its own attempt to lock fails).
bool IsLockHeld(const std::string &lockPath);

}  // namespace fileindex_test

#endif
