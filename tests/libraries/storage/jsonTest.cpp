// SPDX-License-Identifier: Apache-2.0
// What each kind of JSON accepts, where errors are, and texts in other clothes.
#include "libraries/storage/StorageTest.h"

#include "storage/Json.h"
#include "storage/encodings.h"

namespace {

namespace rules = storage::jsonRules;
using storage::JsonRules;

struct Row {
    std::string text;
    std::string strict; ///< what keys, a file of a model and a scene say; "" for accepted
    std::string model;
    std::string scene;
};

TEST(Json, EachKindAcceptsWhatItsRulesSay) {
    const std::string nested = std::string(201, '[') + std::string(201, ']');
    const std::vector<Row> rows{
        {" [1] \n", "", "", ""},
        {"", "line 1, column 1: The document is empty.", "no", "line 1, column 1: The document is empty."},
        {"{\"a\":\n[1,]}", "line 2, column 4: Invalid value.", "no", "line 2, column 4: Invalid value."},
        {std::string("[1]\n\0 ", 6), "line 2, column 1: a NUL byte", "no", "line 2, column 1: a NUL byte"},
        {"\xef\xbb\xbf[1]", "", "no", ""},
        {"\xef[1]", "line 1, column 1: Invalid value.", "no", "line 1, column 1: Invalid value."},
        {"[\"\xff\"]", "line 1, column 3: Invalid encoding in string.", "", ""},
        {nested, "", "", "line 1, column 201: nested more than 200 levels deep"},
    };
    const auto errorBy = [](const std::string& text, const JsonRules& kind) {
        return failureOf([&] { storage::parseJson(text, kind); });
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.text.substr(0, 20));
        EXPECT_EQ(errorBy(row.text, rules::keys), row.strict);
        EXPECT_EQ(errorBy(row.text, rules::scene), row.scene);
        EXPECT_EQ(errorBy(row.text, rules::modelMetadata).empty(), row.model.empty());
        std::stringbuf source(row.text);
        storage::JsonDocument document;
        EXPECT_EQ(storage::parseJson(document, source, rules::principalShapes), row.model.empty());
    }
    // the nearest double, and another that is faster to read
    const char* const number = "[0.27354920184912343]";
    EXPECT_EQ(storage::parseJson(number, rules::scene)[0].GetDouble(), 0.27354920184912343);
}

TEST(Texts, AreTakenForWhatTheyAre) {
    EXPECT_EQ(storage::base64("") + storage::base64("f") + storage::base64("fo") + storage::base64("\xff\xfe\xfd"),
              "Zg==Zm8=//79");
    for (const std::string bytes : {"", "f", "fo", "\xff\xfe\xfd", "four", "fifth"}) {
        const std::string text = storage::base64(bytes);
        EXPECT_EQ(storage::fromBase64(text), bytes);
        EXPECT_EQ(storage::fromBase64(text.substr(0, text.find('='))), bytes);
    }
    for (const char* damaged : {"Z", "Zm9vZ", "Zm8-", "Z===", "Zg=a", "Zm9v Zm9v"})
        EXPECT_FALSE(storage::fromBase64(damaged)) << damaged;
    const std::pair<const char*, std::size_t> rows[] = {
        {"", 0},     {"a\xff", 1},    {"\xc3\xa9", 2},     {"\xe2\x82\xac", 3},     {"\xf0\x9f\x98\x80", 4},
        {"\xc3", 0}, {"\xc0\x80", 0}, {"\xed\xa0\x80", 0}, {"\xf5\x80\x80\x80", 0}, {"\xa9", 0}};
    for (const auto& [text, length] : rows)
        EXPECT_EQ(storage::utf8Length(text), length) << text;
    EXPECT_TRUE(storage::isUtf8(std::string("a\0\xc3\xa9", 4)));
    EXPECT_FALSE(storage::isUtf8("a\xc3"));
}

} // namespace
