// A fresh appliance under the build's sandbox root for every test: the configuration, lock and run
// directories, the emulated platform's state directory, and the volumes and shares a test declares.
#ifndef FILEINDEX_TESTS_SANDBOX_H
#define FILEINDEX_TESTS_SANDBOX_H

#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <json/value.h>

#include "appliance_paths.h"

namespace fileindex_test {

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

    // Forces platform results through the emulation's faults.json.
    static void SetFaults(const Json::Value &faults);
    // The emulation's journal, one object per side-effecting platform call.
    static std::vector<Json::Value> Journal();
    // Journal entries of one operation.
    static std::vector<Json::Value> JournalOf(const std::string &op);

private:
    static std::vector<std::pair<std::string, std::string>> s_shares;
};

// Small file helpers for assertions.
std::string ReadFile(const std::string &path);
void WriteFile(const std::string &path, const std::string &content);
bool PathExists(const std::string &path);
void MakeDirs(const std::string &path);
Json::Value ParseJson(const std::string &text);  // fails the test on invalid text

}  // namespace fileindex_test

#endif
