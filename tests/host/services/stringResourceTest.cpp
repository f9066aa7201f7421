// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HStringResource.h"

#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

namespace {

struct Lookup {
    HString text;
    HStatus status;
};

Lookup lookUp(const HStringResourceId& id) {
    HStatus status = HStatus::kFailure; // must be written with success too
    HString text = HStringResource::getString(id, status);
    return {text, status};
}

TEST(StringResource, RegisteredTextWinsOverTheDefault) {
    ASSERT_FALSE(HStringResource::registerString({"strings", "kHello", "Hello"}).error());
    ASSERT_FALSE(HStringResource::registerString({"others", "kHello", "Goodbye"}).error());
    EXPECT_EQ(lookUp({"strings", "kHello", "another default"}).text, "Hello");
    EXPECT_EQ(lookUp({"others", "kHello", ""}).text, "Goodbye");

    ASSERT_FALSE(HStringResource::registerString({"strings", "kHello", "Hello again"}).error());
    const Lookup again = lookUp({"strings", "kHello", "Hello"});
    EXPECT_EQ(again.text, "Hello again");
    EXPECT_FALSE(again.status.error());
}

TEST(StringResource, UnknownIdGivesTheDefaultItCarries) {
    for (const char* text : {"default", ""}) {
        const Lookup found = lookUp({"strings", "kNobodyRegisteredThis", text});
        EXPECT_EQ(found.text, text);
        EXPECT_FALSE(found.status.error());
    }
}

TEST(StringResource, RefusesIdsWithoutANameAndSaysWhich) {
    const std::vector<HStringResourceId> unusable = {{"", "kKey", "text"}, {"plugin", "", "text"}, {"", "", "text"}};
    for (const HStringResourceId& id : unusable) {
        EXPECT_EQ(HStringResource::registerString(id), HStatus::kInvalidParameter);
        const Lookup found = lookUp(id);
        EXPECT_EQ(found.status, HStatus::kInvalidParameter);
        EXPECT_TRUE(found.text.isEmpty());
        const std::string sentence = found.status.errorString().asStdString();
        EXPECT_NE(sentence.find("'" + id.key().asStdString() + "'"), std::string::npos) << sentence;
    }
}

TEST(StringResource, ReadersSeeWholeTextsWhileAWriterReplacesThem) {
    const HString first(std::string(100, 'a'));
    const HString second(std::string(200, 'b'));
    HStringResource::registerString({"threads", "kText", first});
    std::atomic<int> torn{0};
    std::vector<std::thread> readers;
    readers.reserve(3);
    for (int i = 0; i < 3; ++i)
        readers.emplace_back([&] {
            for (int n = 0; n < 500; ++n) {
                const HString text = lookUp({"threads", "kText", ""}).text;
                torn += text != first && text != second ? 1 : 0;
            }
        });
    for (int n = 0; n < 500; ++n) {
        HStringResource::registerString({"threads", "kText", n % 2 ? first : second});
        HStringResource::registerString({"threads", HString(std::to_string(n)), first});
    }
    for (std::thread& reader : readers)
        reader.join();
    EXPECT_EQ(torn, 0);
}

} // namespace
