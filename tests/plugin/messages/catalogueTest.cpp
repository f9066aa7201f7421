// SPDX-License-Identifier: Apache-2.0
// What the host holds after the catalogue has been registered.
#include "messages/catalogue.h"
#include "messages/messageText.h"

#include "openquarn/HStringResource.h"
#include "openquarn_app/Faults.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <string_view>

namespace {

using OpenQuarn::Faults;

// what translations and the users' own searches rely on: keys, texts and order stay as they are, up to the first of
// those that are raised only
constexpr std::uint64_t sumOfKeysAndTexts = 0x762fc4ee39d31b76U;
constexpr auto registeredCount = static_cast<int>(neuralWarp::Text::kErrorMLOriginalGeomInvalid);

HString textOf(const char* key, const char* defaultText) {
    HStatus status;
    return HStringResource::getString({"neuralWarp", key, defaultText}, status);
}

// FNV-1a (G. Fowler, L. C. Noll, P. Vo), 64 bits, over all keys and texts, each with its NUL
std::uint64_t sumOfCatalogue() {
    std::uint64_t sum = 0xcbf29ce484222325U;
    for (const neuralWarp::CatalogueEntry& entry : neuralWarp::catalogue)
        for (const std::string_view text : {std::string_view(entry.key), std::string_view(entry.text)})
            for (std::size_t i = 0; i <= text.size(); ++i)
                sum = (sum ^ (i < text.size() ? static_cast<unsigned char>(text[i]) : 0U)) * 0x100000001b3U;
    return sum;
}

TEST(Catalogue, IsWhatWasPublished) {
    EXPECT_EQ(neuralWarp::catalogue.size(), 38U);
    EXPECT_EQ(registeredCount, 31);
    EXPECT_EQ(sumOfCatalogue(), sumOfKeysAndTexts) << "who changes a text changes it for those who translate it";
}

TEST(Catalogue, CarriesTheTextsThatAreRaisedOnly) {
    neuralWarp::registerCatalogue();
    for (std::size_t i = registeredCount; i < neuralWarp::catalogue.size(); ++i) {
        const auto text = static_cast<neuralWarp::Text>(i);
        EXPECT_EQ(neuralWarp::messageText(text), neuralWarp::entryOf(text).text);
        EXPECT_EQ(textOf(neuralWarp::entryOf(text).key, "default"), "default") << "is registered";
    }
}

TEST(Catalogue, RegistersInItsOrderAndGoesOnAfterARefusal) {
    const auto keyOf = [](int i) { return neuralWarp::catalogue[static_cast<std::size_t>(i)].key; };
    for (int refused = 1; refused <= registeredCount + 1; ++refused) {
        for (int i = 0; i < registeredCount; ++i)
            ASSERT_FALSE(HStringResource::registerString({"neuralWarp", keyOf(i), "other text"}).error());
        Faults::fail("HStringResource::registerString", refused);
        EXPECT_FALSE(neuralWarp::registerCatalogue().error());
        EXPECT_EQ(Faults::fired("HStringResource::registerString"), refused <= registeredCount);
        Faults::clear();
        for (int i = 0; i < registeredCount; ++i)
            EXPECT_EQ(textOf(keyOf(i), "") == "other text", i + 1 == refused) << keyOf(i);
    }
}

} // namespace
