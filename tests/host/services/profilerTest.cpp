// SPDX-License-Identifier: Apache-2.0
// Recordings, read back from the trace file.
#include "openquarn/HProfiler.h"
#include "openquarn/HProfilingScope.h"
#include "openquarn/HString.h"
#include "openquarn_app/Profiling.h"
#include "support/TemporaryFolder.h"

#include <gmock/gmock.h>
#include <rapidjson/document.h>
#include <rapidjson/error/en.h>
#include <rapidjson/istreamwrapper.h>

#include <algorithm>
#include <fstream>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

using OpenQuarn::Profiling;

struct Event {
    std::string name, category, description;
    int color = 0;
    unsigned thread = 0;
    double begin = 0.0, end = 0.0;

    bool encloses(const Event& inner) const { return begin <= inner.begin && inner.end <= end; }
};

std::vector<Event> readTrace() {
    const TemporaryFolder folder;
    const auto path = folder.path() / "trace.json";
    Profiling::writeTrace(path);
    std::ifstream file(path, std::ios::binary);
    rapidjson::IStreamWrapper stream(file);
    rapidjson::Document trace;
    trace.ParseStream<rapidjson::kParseValidateEncodingFlag>(stream);
    EXPECT_FALSE(trace.HasParseError()) << rapidjson::GetParseError_En(trace.GetParseError());
    EXPECT_EQ(trace["otherData"]["dropped"].GetInt(), 0);
    std::vector<Event> events;
    for (const auto& event : trace["traceEvents"].GetArray()) {
        if (event["ph"] != "X")
            continue;
        const double begin = event["ts"].GetDouble();
        EXPECT_NE(event["cname"].GetStringLength(), 0U);
        events.push_back({event["name"].GetString(), event["cat"].GetString(), event["args"]["description"].GetString(),
                          event["args"]["color"].GetInt(), event["tid"].GetUint(), begin,
                          begin + event["dur"].GetDouble()});
    }
    return events;
}

std::vector<std::string> namesOf(const std::vector<Event>& events) {
    std::vector<std::string> names;
    names.reserve(events.size());
    for (const Event& event : events)
        names.push_back(event.name);
    return names;
}

int evaluation() {
    return HProfiler::getCategoryIndex("Evaluation");
}

TEST(Profiler, CategoriesHaveOneIndexAName) {
    EXPECT_EQ(evaluation(), 0);
    const int mine = HProfiler::getCategoryIndex("profilerTest");
    EXPECT_GT(mine, 0);
    EXPECT_EQ(HProfiler::getCategoryIndex(std::string("profilerTest").c_str()), mine);
    EXPECT_NE(HProfiler::getCategoryIndex("ProfilerTest"), mine);
    EXPECT_EQ(HProfiler::getCategoryIndex(nullptr), -1);
    EXPECT_EQ(HProfiler::getCategoryIndex(""), -1);
}

TEST(Profiler, NestedScopesOfSeveralThreadsKeepWhatTheySay) {
    constexpr int threadCount = 4;
    constexpr int rounds = 25;
    const int category = HProfiler::getCategoryIndex("profilerTest");
    Profiling::start();
    std::vector<std::thread> threads;
    threads.reserve(threadCount);
    for (int t = 0; t < threadCount; ++t)
        threads.emplace_back([&, t] {
            for (int round = 0; round < rounds; ++round) {
                const HProfilingScope outer(evaluation(), 10, "outer", HString(std::to_string(t)));
                const HProfilingScope inner(category, -3, "inner", std::to_string(t).c_str());
            }
        });
    readTrace(); // while they record: a file that can be read, whatever it holds by now
    for (std::thread& thread : threads)
        thread.join();
    Profiling::stop();

    std::map<unsigned, std::vector<Event>> byThread;
    for (const Event& event : readTrace())
        byThread[event.thread].push_back(event);
    ASSERT_EQ(byThread.size(), threadCount);
    std::set<std::string> descriptions;
    for (const auto& [thread, events] : byThread) {
        EXPECT_GE(thread, 1U);
        ASSERT_EQ(events.size(), 2 * rounds);
        for (std::size_t i = 0; i < events.size(); i += 2) { // an inner scope ends before its outer one
            const Event& inner = events[i];
            const Event& outer = events[i + 1];
            EXPECT_EQ(inner.name + inner.category + std::to_string(inner.color), "innerprofilerTest-3");
            EXPECT_EQ(outer.name + outer.category + std::to_string(outer.color), "outerEvaluation10");
            EXPECT_TRUE(outer.encloses(inner));
            EXPECT_TRUE(i == 0 || events[i - 1].end <= outer.begin);
            EXPECT_EQ(inner.description, events[0].description);
            EXPECT_EQ(outer.description, events[0].description);
        }
        descriptions.insert(events[0].description);
    }
    EXPECT_EQ(descriptions.size(), threadCount);
}

TEST(Profiler, RecordsWhatBeginsAndEndsInARecording) {
    { const HProfilingScope unrecorded(evaluation(), 0, "before any start"); }
    auto openAtStart = std::make_unique<HProfilingScope>(evaluation(), 0, "open at the start");
    Profiling::start();
    EXPECT_TRUE(Profiling::isRecording());
    openAtStart.reset();
    { const HProfilingScope kept(evaluation(), 0, "kept"); }
    { const HProfilingScope unknownCategory(-1, 0, "no category"); }
    { const HProfilingScope unknownCategory(100000, 0, "no category"); }
    auto openAtStop = std::make_unique<HProfilingScope>(evaluation(), 0, "open at the stop");
    Profiling::stop();
    EXPECT_FALSE(Profiling::isRecording());
    openAtStop.reset();
    { const HProfilingScope unrecorded(evaluation(), 0, "after the stop"); }
    EXPECT_THAT(namesOf(readTrace()), testing::ElementsAre("kept"));

    auto openAtNextStart = std::make_unique<HProfilingScope>(evaluation(), 0, "of no recording");
    Profiling::start();
    openAtNextStart = std::make_unique<HProfilingScope>(evaluation(), 0, "of the second recording");
    Profiling::start();
    openAtNextStart.reset();
    { const HProfilingScope third(evaluation(), 0, "of the third recording"); }
    EXPECT_THAT(namesOf(readTrace()), testing::ElementsAre("of the third recording"));
    Profiling::stop();
}

TEST(Profiler, AnyTextMakesAFileThatCanBeRead) {
    const std::vector<std::string> texts = {
        "", "\"quoted\" \\ back", "line\nfeed\ttab\x01", "Körper:arm|ω", "not UTF-8: \xff\xc3", std::string(5000, 'x')};
    Profiling::start();
    for (const std::string& text : texts) {
        const HProfilingScope scope(evaluation(), 0, text.c_str(), text.c_str());
    }
    { const HProfilingScope scope(evaluation(), 0, nullptr, nullptr); }
    Profiling::stop();
    const std::vector<Event> events = readTrace();
    ASSERT_EQ(events.size(), texts.size() + 1);
    for (std::size_t i = 0; i < texts.size(); ++i) {
        const bool isUtf8 = texts[i].find('\xff') == std::string::npos;
        const std::string expected = isUtf8 ? texts[i] : "not UTF-8: \u00ff\u00c3";
        EXPECT_EQ(events[i].name, expected);
        EXPECT_EQ(events[i].description, expected);
    }
    EXPECT_EQ(events.back().name, "");
}

TEST(Profiler, NamesAFileThatCannotBeWritten) {
    const TemporaryFolder folder;
    EXPECT_THAT([&] { Profiling::writeTrace(folder.path()); },
                testing::ThrowsMessage<std::runtime_error>(testing::HasSubstr(folder.path().string())));
}

} // namespace
