// Whole-document JSON text: strict reading, compact one-line writing, and bytes kept as bytes.
#include <json/writer.h>

#include "config/json_io.h"
#include "tests/support/sandbox.h"

using namespace VEXO::FILEINDEX;

namespace fileindex_test {
namespace {

TEST(JsonText, ReadsExactlyOneStrictJsonValue)
{
    const struct {
        const char *text;
        bool valid;
    } cases[] = {
        {"{\"a\":1}", true},
        {" \n{\"a\":[1,2.5e-3,-0,true,false,null]}\r\n\t", true},
        {"5", true},
        {"\"top-level string\"", true},
        {"[]", true},
        {"\"\\u00e9\\n\\/\"", true},
        {"", false},
        {"   ", false},
        {"{\"a\":1} x", false},
        {"{\"a\":1}{}", false},
        {"{\"a\":1,}", false},
        {"[1,]", false},
        {"// comment\n{}", false},
        {"{} /* comment */", false},
        {"{'a':1}", false},
        {"01", false},
        {"1.", false},
        {"-", false},
        {".5", false},
        {"1e", false},
        {"+1", false},
        {"NaN", false},
        {"tru", false},
        {"\"raw\x01" "control\"", false},
        {"\"bad \\x escape\"", false},
        {"\"\\u12\"", false},
        {"\"unterminated", false},
        {"{\"a\" 1}", false},
        {"{1:2}", false},
    };
    for (const auto &c : cases) {
        Json::Value value;
        EXPECT_EQ(fromString(value, c.text), c.valid) << "text: " << c.text;
    }
}

TEST(JsonText, RefusesNestingBeyondTheLimitWithoutCrashing)
{
    const std::string deep = std::string(100000, '[') + std::string(100000, ']');
    Json::Value value;
    EXPECT_FALSE(fromString(value, deep));
    const std::string shallow = std::string(100, '[') + std::string(100, ']');
    EXPECT_TRUE(fromString(value, shallow));
}

TEST(JsonText, WritesCompactTextOnOneLine)
{
    Json::Value value;
    value["b"] = Json::Value(Json::arrayValue);
    value["b"].append("x\ny");
    value["a"] = Json::Int64(-1);
    value["c"] = Json::Value(Json::objectValue);
    EXPECT_EQ(toString(value), "{\"a\":-1,\"b\":[\"x\\ny\"],\"c\":{}}");
}

TEST(JsonText, BytesThatAreNotUtf8SurviveWritingAndReadingBack)
{
    const std::string bytes = std::string("caf\xe9 \xff\xfe \xc3\xa9 \"q\" \\ \x1f ") + std::string(1, '\0') + "end";
    Json::Value value;
    value[bytes] = bytes;
    Json::Value reread;
    ASSERT_TRUE(fromString(reread, toString(value)));
    ASSERT_TRUE(reread.isMember(bytes));
    EXPECT_EQ(reread[bytes].asString(), bytes);

    // The JSON library's default writer replaces invalid bytes and so loses the path.
    Json::StreamWriterBuilder defaultWriter;
    Json::Value viaDefault;
    ASSERT_TRUE(fromString(viaDefault, Json::writeString(defaultWriter, value)));
    EXPECT_FALSE(viaDefault.isMember(bytes));
}

class JsonFileTest : public SandboxTest {};

TEST_F(JsonFileTest, FileRoundTripAndMissingFile)
{
    const std::string path = HostPath("/tmp/doc.json");
    Json::Value value;
    EXPECT_FALSE(fromFile(value, path));
    value["k"] = "v";
    ASSERT_TRUE(toFile(value, path));
    EXPECT_EQ(ReadFile(path), "{\"k\":\"v\"}");
    Json::Value reread;
    ASSERT_TRUE(fromFile(reread, path));
    EXPECT_EQ(reread, value);
    EXPECT_FALSE(toFile(value, HostPath("/no/such/dir/doc.json")));
}

}  // namespace
}  // namespace fileindex_test
