#include "config/json_array.h"

#include "tests/support/config_fixture.h"

namespace vesk {
class JsonArrayTest : public ConfigTest {};

TEST_F(JsonArrayTest, HasStringFindsAnEqualElement) {
    const Json::Value array = ParseDocument(R"(["3", "5"])");
    EXPECT_TRUE(JsonArrayHasString(array, "3"));
    EXPECT_TRUE(JsonArrayHasString(array, "5"));
    EXPECT_FALSE(JsonArrayHasString(array, "35"));
    EXPECT_FALSE(JsonArrayHasString(array, ""));
}

TEST_F(JsonArrayTest, HasStringTakesElementsAsText) {
    const Json::Value array = ParseDocument("[3, true, null, 1.5]");
    EXPECT_TRUE(JsonArrayHasString(array, "3"));
    EXPECT_TRUE(JsonArrayHasString(array, "true"));
    EXPECT_TRUE(JsonArrayHasString(array, ""));
    EXPECT_TRUE(JsonArrayHasString(array, "1.5"));
}

TEST_F(JsonArrayTest, HasStringAnswersFalseForWhatIsNoArray) {
    for (const char *text : {"true", "null", "{}", "{\"3\" : \"3\"}", "\"3\"", "3", "[]"}) {
        EXPECT_FALSE(JsonArrayHasString(ParseDocument(text), "3")) << text;
    }
}

TEST_F(JsonArrayTest, HasStringLeavesTheCallersArrayAlone) {
    const Json::Value array = ParseDocument("[3]");
    JsonArrayHasString(array, "3");
    EXPECT_EQ(array, ParseDocument("[3]"));
}

TEST_F(JsonArrayTest, RemovingTheOnlyMatchKeepsTheOthersInOrder) {
    Json::Value array = ParseDocument(R"(["3", "5", "3"])");
    CapturedLog log;
    EXPECT_EQ(JsonArrayRemoveString(array, "5"), 0);
    EXPECT_EQ(array, ParseDocument(R"(["3", "3"])"));
    EXPECT_EQ(log.Messages(), Messages{});
}

TEST_F(JsonArrayTest, RemovingWhatStandsTwiceFailsAndChangesNothing) {
    Json::Value array = ParseDocument(R"(["3", "5", "3"])");
    CapturedLog log;
    EXPECT_EQ(JsonArrayRemoveString(array, "3"), -1);
    EXPECT_EQ(array, ParseDocument(R"(["3", "5", "3"])"));
    EXPECT_EQ(log.Messages(), Messages{"Remove string error, count =2"});
}

TEST_F(JsonArrayTest, RemovingFromAnEmptyArrayFailsWithCount0) {
    Json::Value array(Json::arrayValue);
    CapturedLog log(2);
    EXPECT_EQ(JsonArrayRemoveString(array, "3"), -1);
    EXPECT_EQ(array, Json::Value(Json::arrayValue));
    EXPECT_EQ(log.Messages(),
              Messages{"JsonArrayRemoveString() [N] : ***** Remove string error, count =0"});
}

TEST_F(JsonArrayTest, SurvivorsBecomeStrings) {
    Json::Value array = ParseDocument("[7, 8, true]");
    EXPECT_EQ(JsonArrayRemoveString(array, "8"), 0);
    EXPECT_EQ(array, ParseDocument(R"(["7", "true"])"));
}

TEST_F(JsonArrayTest, RemovingTheLastElementLeavesAnEmptyValue) {
    Json::Value array = ParseDocument(R"(["3"])");
    EXPECT_EQ(JsonArrayRemoveString(array, "3"), 0);
    EXPECT_TRUE(array.isNull());
}
} // namespace vesk
