// SPDX-License-Identifier: Apache-2.0
// Looking a text up and filling its placeholders.
#include "messages/messageText.h"

#include "openquarn/HStringResource.h"
#include "openquarn_app/Faults.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <filesystem>
#include <limits>
#include <locale>
#include <string>

namespace {

using neuralWarp::filledText;
using neuralWarp::messageText;
using neuralWarp::Text;
using OpenQuarn::Faults;

TEST(MessageText, FillsEachKindOfArgument) {
    EXPECT_EQ(filledText<Text::kErrorMlNoModelPath>(), "[NEURAL WARP] No model path specified");
    EXPECT_EQ(filledText<Text::kErrorMLMetaLoadFailed>(HString("warp^2s"), std::filesystem::path("/m/a b.nwrp")),
              "[NEURAL WARP \"warp^2s\"] Failed to load metadata from /m/a b.nwrp");
    EXPECT_EQ(filledText<Text::kErrorMLDataInvalidIndex>(std::numeric_limits<std::uint64_t>::max()),
              "[NEURAL WARP] Could not get neural warp data for index 18446744073709551615");
}

TEST(MessageText, FillsAPlaceholderAsOftenAsItOccurs) {
    EXPECT_EQ(filledText<Text::kWarnMLMetaSetup>(HString("warp1"), 7U, 10U, 20U, std::string("face")),
              "[NEURAL WARP \"warp1\", multiIndex 7] Setup for multiIndex 7 not the same as for trained model. Using "
              "deltas on 10 of 20 affected verts. Trained model subset is \"face\"");
}

struct Grouping : std::numpunct<char> {
    char do_thousands_sep() const override { return '.'; }
    std::string do_grouping() const override { return "\3"; }
};

TEST(MessageText, CountsArePlainDecimalInEveryLocale) {
    const std::locale before = std::locale::global(std::locale(std::locale::classic(), new Grouping));
    const HString text = filledText<Text::kErrorMLTargetMismatch>(std::size_t{1234567}, 0);
    std::locale::global(before);
    EXPECT_EQ(text, "[NEURAL WARP] Size of target geometry (1234567) does not match deforming geometry (0)");
}

TEST(MessageText, FailedLookupIsAnUnknownError) {
    Faults::fail("HStringResource::getString");
    EXPECT_EQ(filledText<Text::kErrorMLModelInit>(3U), "unknown error");
    EXPECT_EQ(filledText<Text::kErrorMLModelInit>(3U), "[NEURAL WARP] No ML model initialized for index 3");
    Faults::clear();
    // any other status leaves the text of the host
    EXPECT_EQ(messageText({"", "kNoPlugin", "default"}), "");
}

TEST(MessageText, ShowsATextThatTheHostHoldsInPlaceOfTheDefault) {
    const HStringResourceId id = neuralWarp::idOf(Text::kMlNodeVertexCountMismatch);
    HStringResource::registerString({id.pluginId(), id.key(), "^2s statt ^1s Punkte"});
    EXPECT_EQ(filledText<Text::kMlNodeVertexCountMismatch>(4U, 5U), "5 statt 4 Punkte");
    HStringResource::registerString(id);
}

} // namespace
