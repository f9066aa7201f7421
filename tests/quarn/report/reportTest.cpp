// SPDX-License-Identifier: Apache-2.0
// What a report says of figures that are known, and what it is asked for by words.
#include "quarn/report/Report.h"
#include "quarn/console/UsageError.h"
#include "quarn/report/companions.h"
#include "storage/WholeFile.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

namespace quarn {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

// two vertices in a unit that is a millimetre: `before` and `after` are what the second one is off in frames 1, 2, 3
Row rowWith(std::vector<float> before, std::vector<float> after) {
    Row row{MeasuredRow(1.0), {}, {}};
    row.measured.name = "hand";
    row.measured.model.mode = "surface";
    row.measured.model.kind = "principal";
    row.measured.frames = {1, static_cast<int>(before.size()), 1};
    const std::vector<float> target(6);
    for (std::size_t i = 0; i < before.size(); ++i) {
        row.measured.before.add(static_cast<int>(i) + 1, std::vector<float>{0, 0, 0, before[i], 0, 0}, target);
        row.measured.after.add(static_cast<int>(i) + 1, std::vector<float>{0, 0, 0, 0, after[i], 0}, target);
    }
    row.measured.cpu.add(1, 0.0004);
    return row;
}

TEST(Report, SaysInASentenceWhatTheNetworkDoes) {
    const struct {
        std::vector<float> before, after;
        const char *joint, *effect, *worst;
    } rows[] = {
        {{4, 4},
         {0.1F, 0.8F},
         "thumb_root",
         "The network takes away 89 % of the error",
         "0.80 mm at thumb_root (vertex 1), frame 2"},
        {{100, 100}, {0.25F, 0.25F}, "", "The network takes away 99.7 % of the error", "0.25 mm at vertex 1, frame 1"},
        {{100}, {0.00001F}, "", "The network takes away 99.9 % of the error", "less than 0.01 mm at vertex 1, frame 1"},
        {{2}, {0}, "", "The network takes away 100 % of the error", "0 mm at vertex 0, frame 1"},
        {{8}, {10}, "", "The network adds 25 % to the error", "10 mm at vertex 1, frame 1"},
        {{0},
         {3},
         "",
         "There is no error to be taken away, and the network adds 1.5 mm in the mean",
         "3.0 mm at vertex 1, frame 1"}};
    for (const auto& [before, after, joint, effect, worst] : rows) {
        Row row = rowWith(before, after);
        row.measured.jointAfter = joint;
        EXPECT_EQ(sentenceOf(row.measured), std::string(effect) + " at 0.40 ms a frame; worst " + worst + ".");
    }
}

TEST(Report, JudgesAgainstTheBetterOfSkinAndZeroDeltas) {
    const struct {
        const char *mean, *max;
        double zeroDeltas; ///< mean and largest; 0: not known
        bool isKept;
        const char* verdict;
    } rows[] = {
        {"", "", 0, true, ""},
        {"0.0625", "0.125", 0, true, "Limits kept: mean 6.25 % (6.25 % allowed), largest 12.5 % (12.5 % allowed)."},
        {"6.2%", "", 0, false, "Limits not kept: mean 6.25 % (6.2 % allowed)."},
        {"", "0.9mm", 0, false, "Limits not kept: largest 1 mm (0.9 mm allowed)."},
        {"0.1", "1mm", 2, false, "Limits not kept: mean 12.5 % (10 % allowed), largest 1 mm (1 mm allowed)."}};
    for (const auto& [mean, max, zeroDeltas, isKept, verdict] : rows) {
        SCOPED_TRACE(verdict);
        Row row = rowWith({8, 8}, {0, 1}); // means of 4 and 0.25
        RowRequest request;
        if (mean[0] != 0)
            request.mean = limitOf(mean);
        if (max[0] != 0)
            request.max = limitOf(max);
        if (zeroDeltas > 0)
            row.evaluation = Evaluation{{zeroDeltas, zeroDeltas, zeroDeltas, zeroDeltas, 1, 0}, {}};
        row.judged = judge(row, request);
        EXPECT_EQ(row.isKept(), isKept);
        EXPECT_EQ(verdictOf(row), verdict);
    }
    Row nothing = rowWith({0}, {1});
    RowRequest request;
    request.max = limitOf("50%");
    nothing.judged = judge(nothing, request);
    EXPECT_EQ(verdictOf(nothing), "Limits not kept: largest something where there was nothing (50 % allowed).");
    EXPECT_EQ(nothing.part(&StageFigures::mean), std::nullopt);
}

TEST(Report, WordsAreForOneRowOrForAll) {
    RowWords words;
    words.scenes = {"hand=a.json", "b/x=1/face.json"};
    words.models = {"both", "face=mine"};
    words.trainings = {"hand=t=1"};
    words.maxima = {"face=0.5mm"};
    const std::vector<RowRequest> rows = rowsOf(words);
    ASSERT_EQ(rows.size(), 2U);
    EXPECT_EQ(rows[1].name, "face");
    EXPECT_EQ(rows[1].scene, "b/x=1/face.json");
    EXPECT_EQ(rows[0].model, "both");
    EXPECT_EQ(rows[1].model, "mine");
    EXPECT_EQ(rows[0].training, "t=1");
    EXPECT_TRUE(!rows[0].max && rows[1].max && rows[1].max->isMillimetres);

    const std::vector<std::pair<std::function<void(RowWords&)>, const char*>> refused = {
        {[](RowWords& w) { w.scenes.emplace_back("other/face.json"); }, "two rows are called \"face\""},
        {[](RowWords& w) { w.models = {"leg=x"}; }, "--model leg=x: there is no row \"leg\""},
        {[](RowWords& w) {
             w.models = {"face=x", "face=y"};
         },
         "--model is given twice for \"face\""},
        {[](RowWords& w) { w.trainings = {"t"}; }, "--training t: of which row? Give it as NAME=t"},
        {[](RowWords& w) { w.means = {"-0.1"}; }, "\"-0.1\" is no limit"},
        {[](RowWords& w) { w.means = {"nan"}; }, "\"nan\" is no limit"},
        {[](RowWords& w) { w.means = {"5cm"}; }, "\"5cm\" is no limit"}};
    for (const auto& [change, sentence] : refused) {
        RowWords wrong = words;
        change(wrong);
        EXPECT_THAT(failureOf([&] { rowsOf(wrong); }), HasSubstr(sentence));
    }
}

TEST(Report, ReadsWhatTheTrainerLeaves) {
    const TemporaryFolder folder;
    const auto write = [&](const char* name, const char* text) { storage::writeWhole(folder.path() / name, text); };
    write("report.json",
          R"({"epochs": 2, "device": "cpu", "interrupted": true, "settings": {"a": true, "b": [1], "c": 2.5}})");
    write("losses.csv", "epoch,training,validation\n1,1e-3,\n2,5e-4,\n");
    const TrainingRecord record = readTraining(folder.path());
    EXPECT_THAT(record.training, ElementsAre(1e-3, 5e-4));
    EXPECT_TRUE(record.validation.empty() && record.isInterrupted && !record.seed);
    EXPECT_THAT(record.settings, ElementsAre(std::pair("a", "yes"), std::pair("c", "2.5")));
    for (const auto& [losses, sentence] :
         {std::pair("e\n1\n", "has the line \"1\""), std::pair("e\n1,x,\n", "has the line \"1,x,\""),
          std::pair("e\n1,nan,\n", "has the line"), std::pair("e\n1,2,3\n2,3,\n", "of some epochs only")}) {
        write("losses.csv", losses);
        EXPECT_THAT(failureOf([&] { readTraining(folder.path()); }), HasSubstr(sentence));
    }
    write("said.json", R"({"base": {"mean": {"mm": 1}, "p99": {"mm": 2}, "p9999": {"mm": 3}, "max": {"mm": 4},
                           "worstFrame": 9, "worstVertex": 5}, "basis": null})");
    const Evaluation evaluation = readEvaluation(folder.path() / "said.json");
    EXPECT_EQ(evaluation.zeroDeltas.p9999, 3.0);
    EXPECT_EQ(evaluation.zeroDeltas.vertex, 5U);
    EXPECT_FALSE(evaluation.basis);
    write("said.json", R"({"base": {"mean": {"mm": 1}}})");
    EXPECT_THAT(failureOf([&] { readEvaluation(folder.path() / "said.json"); }),
                HasSubstr("has no p99: another version"));
}

TEST(Report, FilesHavePlainNamesOfTheirOwn) {
    std::vector<std::string> taken{"report"};
    std::vector<std::string> files;
    for (const char* name : {"hand", "report", "a/../b c", "a____b_c", "", ".x", "\xc3\xa4"})
        files.push_back(fileNameFor(name, taken));
    EXPECT_THAT(files, ElementsAre("hand", "report-2", "a_.._b_c", "a____b_c", "_", "_.x", "__"));
}

TEST(Report, DrawsTheWorstFrameAndOthersThatAreSpread) {
    EXPECT_THAT(drawnFrames({1, 120, 1}, 63, 4), ElementsAre(63, 21, 61, 101));
    EXPECT_THAT(drawnFrames({10, 20, 5}, 15, 9), ElementsAre(15, 10, 20));
    EXPECT_THAT(drawnFrames({7, 7, 1}, 7, 4), ElementsAre(7));
    EXPECT_THAT(drawnFrames({1, 9, 1}, 3, 0), ElementsAre());
}

} // namespace
} // namespace quarn
