// The encoding fileindexctl and the panel give byte strings in JSON and on a terminal.
#include <stdio.h>

#include <string>

#include <gtest/gtest.h>

#include "tools/common/path_encoding.h"

namespace {

using namespace fileindex_tool;

// What bash makes of a word: the bytes printf writes for it.
std::string ShellWord(const std::string &word)
{
    const std::string script = ::testing::TempDir() + "shell_word.sh";
    FILE *file = fopen(script.c_str(), "w");
    fputs(("printf %s " + word).c_str(), file);
    fclose(file);
    FILE *shell = popen(("bash " + script).c_str(), "r");
    std::string bytes;
    for (int c; shell != nullptr && (c = fgetc(shell)) != EOF;) {
        bytes += static_cast<char>(c);
    }
    if (shell != nullptr) {
        pclose(shell);
    }
    return bytes;
}

// Each form of each byte string, and the way back: the percent form decodes to the exact bytes, and
// the terminal form, pasted into a shell, is the exact bytes too.
TEST(PathEncodingTest, EveryFormOfABytePathAndItsWayBack)
{
    const struct Row {
        std::string bytes, display, percent, terminal;
    } rows[] = {
        {"/photo/holiday", "/photo/holiday", "/photo/holiday", "/photo/holiday"},
        {"/photo/a b'c\"", "/photo/a b'c\"", "/photo/a%20b%27c%22", "/photo/a b'c\""},
        {"/music/M\xc3\xbcsic \xe2\x82\xac \xf0\x9f\x8e\xb5", "/music/M\xc3\xbcsic \xe2\x82\xac \xf0\x9f\x8e\xb5",
         "/music/M%C3%BCsic%20%E2%82%AC%20%F0%9F%8E%B5", "/music/M\xc3\xbcsic \xe2\x82\xac \xf0\x9f\x8e\xb5"},
        {"/photo/caf\xe9", "/photo/caf\\xe9", "/photo/caf%E9", "$'/photo/caf\\xe9'"},
        {"/photo/\x1b[2J\x1b]0;x\x07", "/photo/\x1b[2J\x1b]0;x\x07", "/photo/%1B%5B2J%1B%5D0%3Bx%07",
         "$'/photo/\\e[2J\\e]0;x\\a'"},
        {"/a\nb\tc\r\\d'", "/a\nb\tc\r\\d'", "/a%0Ab%09c%0D%5Cd%27", "$'/a\\nb\\tc\\r\\\\d\\''"},
        // C1 controls (U+009B is a CSI), DEL, an overlong "/", a surrogate, a cut sequence.
        {"/x\xc2\x9b" "2J\x7f", "/x\xc2\x9b" "2J\x7f", "/x%C2%9B2J%7F", "$'/x\\xc2\\x9b2J\\x7f'"},
        {"/\xc0\xaf\xed\xa0\x80\xe2\x82", "/\\xc0\\xaf\\xed\\xa0\\x80\\xe2\\x82", "/%C0%AF%ED%A0%80%E2%82",
         "$'/\\xc0\\xaf\\xed\\xa0\\x80\\xe2\\x82'"},
        {"-._~%+", "-._~%+", "-._~%25%2B", "-._~%+"},
    };
    for (const Row &row : rows) {
        SCOPED_TRACE(row.percent);
        EXPECT_EQ(DisplayText(row.bytes), row.display);
        EXPECT_EQ(IsValidUtf8(row.bytes), row.display == row.bytes && row.bytes.find("\\x") == std::string::npos);
        EXPECT_EQ(PercentEncode(row.bytes), row.percent);
        std::string decoded;
        EXPECT_TRUE(PercentDecode(row.percent, decoded));
        EXPECT_EQ(decoded, row.bytes);
        EXPECT_EQ(TerminalText(row.bytes), row.terminal);
        if (row.terminal != row.bytes) {
            EXPECT_EQ(ShellWord(row.terminal), row.bytes);
        }
    }
    // Decoding reads plain text as itself and either case of hex; a "%" without two hex digits is refused
    // and leaves the output alone.
    std::string bytes = "kept";
    EXPECT_TRUE(PercentDecode("/a b/%c3%a9", bytes));
    EXPECT_EQ(bytes, "/a b/\xc3\xa9");
    for (const char *bad : {"/a%", "/a%4", "/a%4g", "%%41"}) {
        bytes = "kept";
        EXPECT_FALSE(PercentDecode(bad, bytes)) << bad;
        EXPECT_EQ(bytes, "kept");
    }
}

}  // namespace
