// Reading JSON text: exactly one strict JSON value, or nothing. (Writing is checked byte for byte
// wherever the library writes: the documents, the frames, the queue records.)
#include "config/json_io.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

TEST(JsonText, ReadsExactlyOneStrictJsonValue)
{
    const struct {
        std::string text;
        bool valid;
    } cases[] = {
        {"{\"a\":1}", true}, {" \n{\"a\":[1,2.5e-3,-0,true,false,null]}\r\n\t", true}, {"5", true}, {"[]", true},
        {"\"top-level string\"", true}, {"\"\\u00e9\\n\\/\"", true},
        {std::string(100, '[') + std::string(100, ']'), true},  // deep, within the limit
        // Not one value, or not strict: comments, trailing commas, single quotes, bare names.
        {"", false}, {"   ", false}, {"{\"a\":1} x", false}, {"{\"a\":1}{}", false}, {"{\"a\":1,}", false},
        {"[1,]", false}, {"// comment\n{}", false}, {"{} /* comment */", false}, {"{'a':1}", false}, {"{1:2}", false},
        {"{\"a\" 1}", false}, {"NaN", false}, {"tru", false},
        // Numbers the JSON library would take on its own.
        {"01", false}, {"1.", false}, {"-", false}, {".5", false}, {"1e", false}, {"+1", false},
        // Strings: raw control characters, unknown or short escapes, no end.
        {"\"raw\x01" "control\"", false}, {"\"bad \\x escape\"", false}, {"\"\\u12\"", false},
        // Surrogate escapes only in pairs: an unpaired one would be decoded into a wrong character.
        {"\"\\ud83d\\ude00\"", true}, {"\"\\ud800\\u0041\"", false}, {"\"\\ud800\"", false}, {"\"\\udc00\"", false},
        {"\"\\ud800\\ud800\"", false},
        {"\"unterminated", false},
        {std::string(100000, '[') + std::string(100000, ']'), false},  // too deep: refused, not recursed into
    };
    for (const auto &c : cases) {
        Json::Value value;
        EXPECT_EQ(fromString(value, c.text), c.valid) << "text: " << c.text.substr(0, 40);
    }
}

}  // namespace
}  // namespace fileindex_test
