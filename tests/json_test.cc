// The JSON conveniences: strict reading, compact writing, atomic replacement.
#include "testkit.h"

namespace {

class JsonFileTest : public testkit::Sandbox {};

TEST(JsonTest, ReadingIsStrict) {
    Json::Value value;
    EXPECT_TRUE(fromString(value, " {\"a\": [1, 2]} \n"));
    EXPECT_EQ(value["a"][1].asInt(), 2);
    EXPECT_TRUE(fromString(value, "7"));
    for (const char* text : {"{\"a\":1} x", "[1 /* c */]", "{\"a\": 1 // c\n}", "{\"a\":1,}", "// c\n{}", "{'a':1}", "[1,,2]", "", "nan"}) {
        SCOPED_TRACE(text);
        Json::Value untouched = "before";
        EXPECT_FALSE(fromString(untouched, text)) << text;
        EXPECT_EQ(untouched.asString(), "before");
    }
}

TEST(JsonTest, NestingBeyondTheLimitIsAnErrorNotACrash) {
    Json::Value value;
    const std::string ok = std::string(kJsonNestingLimit - 1, '[') + std::string(kJsonNestingLimit - 1, ']');
    EXPECT_TRUE(fromString(value, ok));
    const std::string deep = std::string(kJsonNestingLimit + 2, '[') + std::string(kJsonNestingLimit + 2, ']');
    EXPECT_FALSE(fromString(value, deep));
}

TEST(JsonTest, WritingIsOneCompactLineKeepingUtf8) {
    Json::Value value(Json::objectValue);
    value["b"] = "Müsik\nline";
    value["a"] = Json::Value(Json::arrayValue);
    EXPECT_EQ(toString(value), "{\"a\":[],\"b\":\"Müsik\\nline\"}");
}

TEST_F(JsonFileTest, ToFileReplacesAtomicallyAndFromFileReadsBack) {
    const std::string path = Path("/data.json");
    testkit::WriteFile(path, "old");
    Json::Value value(Json::objectValue);
    value["k"] = 1;
    ASSERT_TRUE(toFile(value, path));
    Json::Value back;
    ASSERT_TRUE(fromFile(back, path));
    EXPECT_EQ(back, value);
    EXPECT_FALSE(toFile(value, Path("/missing/dir/x.json")));
    EXPECT_FALSE(fromFile(back, Path("/missing.json")));
    EXPECT_FALSE(fromFile(back, Path("/volume1")));
}

}  // namespace
