// SPDX-License-Identifier: Apache-2.0
// Displays, animation, usage, resources, external content.
#include "openquarn/HAnimControl.h"
#include "openquarn/HExternalContentInfoTable.h"
#include "openquarn/HExternalContentLocationTable.h"
#include "openquarn/HGlobal.h"
#include "openquarn/HLongWork.h"
#include "openquarn/Instrumenter.h"
#include "openquarn_app/Animation.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Resources.h"
#include "openquarn_app/Session.h"
#include "openquarn_app/Usage.h"

#include <gmock/gmock.h>

#include <cmath>
#include <filesystem>
#include <limits>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

using OpenQuarn::Animation;
using OpenQuarn::Resources;
using OpenQuarn::Usage;

TEST(Displays, EachHasItsSeverity) {
    std::vector<std::string> shown;
    OpenQuarn::setMessageSink(
        [&](const OpenQuarn::Message& m) { shown.push_back(std::string(severityName(m.severity)) + ": " + m.text); });
    HGlobal::displayError("e^1s");
    HGlobal::displayWarning("");
    HGlobal::displayInfo(HString(std::string("a\0b", 3)));
    HLongWork::announce("a knot", 124.2);
    HLongWork::announce("a loop", std::nan(""));
    OpenQuarn::setMessageSink({});
    EXPECT_THAT(shown, testing::ElementsAre("error: e^1s", "warning: ", std::string("info: a\0b", 9),
                                            "warning: a knot: up to 125 s", "warning: a loop: up to 1 s"));
}

TEST(AnimationState, IsWhatTheApplicationSets) {
    EXPECT_EQ(HAnimControl::currentTime(), HTime(0.0));
    OpenQuarn::Session session;
    session.setTime(12.25);
    EXPECT_EQ(HAnimControl::currentTime(), HTime(12.25));

    Animation::setRange(-10.5, 30.0);
    EXPECT_EQ(HAnimControl::animationStartTime(), HTime(-10.5));
    EXPECT_EQ(HAnimControl::animationEndTime(), HTime(30.0));
}

TEST(AnimationState, RefusesWhatIsNoRateAndNoRange) {
    Animation::setFramesPerSecond(25.0);
    Animation::setRange(1.0, 2.0);
    const double infinity = std::numeric_limits<double>::infinity();
    for (const double rate : {0.0, -24.0, infinity, std::nan("")})
        EXPECT_THROW(Animation::setFramesPerSecond(rate), std::invalid_argument);
    EXPECT_THROW(Animation::setRange(2.0, 1.0), std::invalid_argument);
    EXPECT_THROW(Animation::setRange(-infinity, 1.0), std::invalid_argument);
    EXPECT_THROW(Animation::setRange(1.0, std::nan("")), std::invalid_argument);
    EXPECT_EQ(HTime::framesPerSecond(), 25.0);
    EXPECT_EQ(HAnimControl::animationEndTime(), HTime(2.0));

    EXPECT_EQ(HTime(50.0).seconds(), 2.0);
    EXPECT_EQ(HTime::fromSeconds(-0.5), HTime(-12.5));
    Animation::setFramesPerSecond(24.0);
}

TEST(UsageEvents, AreCountedByNameOnAllThreads) {
    Usage::clear();
    const Instrumenter loaded = Instrumenter::with("TEST.LOADED");
    EXPECT_TRUE(Usage::events().empty());
    std::vector<std::thread> threads;
    threads.reserve(3);
    loaded.instrument();
    for (int i = 0; i < 3; ++i)
        threads.emplace_back([&] {
            for (int n = 0; n < 100; ++n)
                loaded.instrument();
            Instrumenter::with("TEST.ENDED").instrument();
        });
    for (std::thread& thread : threads)
        thread.join();
    Instrumenter::with("").instrument();

    const auto events = Usage::events();
    ASSERT_EQ(events.size(), 2U);
    EXPECT_EQ(events[0].name + std::to_string(events[0].count), "TEST.LOADED301");
    EXPECT_EQ(events[1].name + std::to_string(events[1].count), "TEST.ENDED3");
}

TEST(ResourceFolder, IsAbsoluteAndEndsWithoutASeparator) {
    const std::string first = Resources::path();
    EXPECT_TRUE(std::filesystem::path(first).is_absolute()) << first;
    EXPECT_TRUE(std::filesystem::path(first).has_filename()) << first;
    const std::string here = std::filesystem::current_path().string();
    const std::pair<const char*, std::string> rows[] = {
        {"/opt/host", "/opt/host"}, {"/opt/host//", "/opt/host"}, {"/", "/"}, {"data/..//res/", here + "/res"}};
    for (const auto& [path, expected] : rows) {
        Resources::setPath(path);
        EXPECT_EQ(HGlobal::getAbsolutePathToResources(), HString(expected));
    }
    Resources::setPath({});
    EXPECT_EQ(Resources::path(), first);
}

TEST(ExternalContent, ListsWhatWasAddedInItsOrder) {
    HExternalContentInfoTable table;
    EXPECT_FALSE(table.addUnresolvedEntry("modelRoot", "~/models", "warp1", "model directory").error());
    EXPECT_FALSE(table.addResolvedEntry("cache", "c", "/c", "warp1").error());
    EXPECT_EQ(table.addResolvedEntry("", "c", "/c", "warp1"), HStatus::kInvalidParameter);
    EXPECT_EQ(table.addUnresolvedEntry("cache", "other", "warp2"), HStatus::kFailure);

    HStatus status;
    ASSERT_EQ(table.length(), 2U);
    EXPECT_EQ(table.key(0, &status) + table.key(1), "modelRootcache");
    EXPECT_FALSE(status.error());
    EXPECT_EQ(table.key(2, &status), "");
    EXPECT_EQ(status, HStatus::kFailure);

    HExternalContentInfo info;
    ASSERT_FALSE(table.getInfo("modelRoot", info).error());
    EXPECT_EQ(info.unresolvedLocation + info.contextNode + info.role, "~/modelswarp1model directory");
    EXPECT_FALSE(info.isResolved);
    ASSERT_FALSE(HExternalContentInfoTable(table).getInfo("cache", info).error());
    EXPECT_EQ(info.resolvedLocation, "/c");
    EXPECT_TRUE(info.isResolved);
    EXPECT_EQ(table.getInfo("Cache", info), HStatus::kFailure);
    EXPECT_EQ(info.key, "cache");
}

TEST(ExternalContent, HandsOutNewLocations) {
    HExternalContentLocationTable table;
    EXPECT_FALSE(table.addEntry("modelRoot", "/new/place").error());
    EXPECT_EQ(table.addEntry("modelRoot", "/other"), HStatus::kFailure);
    EXPECT_EQ(table.addEntry("", "/other"), HStatus::kInvalidParameter);
    HString location = "kept";
    const HStatus missing = table.getLocation("cache", location);
    EXPECT_EQ(missing, HStatus::kFailure);
    EXPECT_THAT(missing.errorString().asStdString(), testing::HasSubstr("'cache'"));
    EXPECT_EQ(location, "kept");
    EXPECT_FALSE(table.getLocation("modelRoot", location).error());
    EXPECT_EQ(location, "/new/place");
    EXPECT_EQ(table.length(), 1U);
    EXPECT_EQ(table.key(0), "modelRoot");
}

} // namespace
