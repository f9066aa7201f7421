// SPDX-License-Identifier: Apache-2.0
// Parts become what one export makes, to the byte, or are refused before anything is written.
#include "quarn/dataset/ExportScene.h"

#include "quarn/console/build.h"
#include "quarn/dataset/DatasetFolder.h"
#include "quarn/dataset/DatasetWriter.h"
#include "quarn/dataset/merging.h"
#include "quarn/scene/PartRecord.h"
#include "quarn/scene/plugs.h"
#include "storage/FolderLock.h"
#include "storage/WholeFile.h"

#include "host/support/testDeformers.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <fstream>
#include <functional>
#include <random>
#include <thread>

#include <sys/mount.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

namespace fs = std::filesystem;
using ::testing::AllOf;
using ::testing::HasSubstr;

constexpr std::size_t frames = 12;

class MergeTest : public ExportScene {
protected:
    MergeTest() { writeTarget(frames); }

    fs::path exported(const std::string& name, const std::string& of, int preroll = 0) const {
        quarn::ExportOptions flags = options();
        flags.frames = name.substr(name.find(' ') + 1);
        flags.part = {of, preroll};
        flags.output = folder.path() / (of.empty() ? "whole " + name : name);
        quarn::exportDatasets(flags);
        return flags.output;
    }
    /// Folders of parts, each named by its frames.
    std::vector<fs::path> parts(const std::vector<std::string>& ranges, const std::string& of) const {
        std::vector<fs::path> folders;
        folders.reserve(ranges.size());
        for (const std::string& range : ranges)
            folders.push_back(exported(range, of));
        return folders;
    }

    quarn::MergeOptions merging(std::vector<fs::path> parts) const {
        quarn::MergeOptions flags;
        flags.parts = std::move(parts);
        flags.output = folder.path() / "merged";
        flags.console.quiet = true;
        return flags;
    }
    static std::string mergeError(const quarn::MergeOptions& flags) {
        return failureOf([&] { quarn::mergeDatasets(flags); });
    }

    static void put(const fs::path& file, const std::string& text) { std::ofstream(file, std::ios::binary) << text; }
    static void change(const fs::path& file, const std::string& from, const std::string& to) {
        std::string text = contentOf(file);
        const std::size_t at = text.find(from);
        ASSERT_NE(at, std::string::npos) << from;
        put(file, text.replace(at, from.size(), to));
    }
    static void changeRecord(const fs::path& part, const std::function<void(quarn::PartRecord&)>& change) {
        quarn::PartRecord record = quarn::PartRecord::read(part / quarn::PartRecord::fileName).value();
        change(record);
        put(part / quarn::PartRecord::fileName, record.json());
    }
};

// uneven parts in any order, of steps, of a partial subset, drawn poses, both kinds of deltas
TEST_F(MergeTest, PartsAreOneExport) {
    struct Case {
        std::string of;
        std::vector<std::string> parts;
        std::string more;
    };
    const std::vector<Case> cases = {
        {"1-12", {"6-6", "7-12", "1-5"}, "setAttr swing.drawnKeys 1; setAttr warp.train[0].learningRate 1e-05"},
        {"1-12", {"1-12"}, "setAttr warp.export[0].deltaMode Offset"},
        {"2-12x3", {"8-11x3", "2", "5"}, "setAttr warp.train[0].validationRatio 0.3"},
        {"2-11x2", {"2-4x2", "6-10x2"}, "setAttr warp.input[0].componentTagExpression tip"},
    };
    for (const Case& one : cases) {
        SCOPED_TRACE(one.of + " " + one.more);
        {
            quarn::SceneSession session;
            build(frames, one.more);
            HPlug mesh = quarn::findPlug("strip.inMesh");
            mesh.setHObject(testDeformers::withTag(mesh.asHObject(), "tip", HUintArray{7, 3}));
            session.save(scene());
        }
        const auto expected = contentsOf(exported(one.of, ""));
        quarn::MergeOptions flags = merging(parts(one.parts, one.of));
        const quarn::MergeAnswer answer = quarn::mergeDatasets(flags);
        EXPECT_EQ(contentsOf(flags.output), expected);
        EXPECT_EQ(answer.instructionSets, std::set<std::string>{quarn::instructionSet()});
        EXPECT_TRUE(quarn::mergeDatasets(flags).wasComplete);
        flags.overwrite = true;
        EXPECT_FALSE(quarn::mergeDatasets(flags).wasComplete);
        EXPECT_EQ(contentsOf(flags.output), expected);
        for (const auto& entry : fs::directory_iterator(folder.path()))
            if (entry.is_directory())
                fs::remove_all(entry.path());
    }
}

TEST_F(MergeTest, APartGoesOnAndKeepsItsRecord) {
    save(frames);
    const auto expected = contentsOf(exported("4-9", "1-12"));
    ASSERT_EQ(expected.count("part.json"), 1U);
    const fs::path part = folder.path() / "4-9.part";
    fs::rename(folder.path() / "4-9", part);
    for (const char* text : {"dataset.json", "part.json"})
        fs::remove(part / text);
    quarn::DatasetWriter writer(part, {6, 8, vertexCount});
    writer.begin(); // nothing is known of the rows: all are made again
    exported("4-9", "1-12", 2);
    EXPECT_EQ(contentsOf(folder.path() / "4-9"), expected);
}

TEST_F(MergeTest, FramesBeforeTheFirstAreEvaluated) {
    writeTarget(frames, [](std::size_t frame, std::vector<float>& xyz) {
        if (frame == 2) // the third
            xyz[0] = std::numeric_limits<float>::quiet_NaN();
    });
    save(frames);
    EXPECT_THAT(failureOf([&] { exported("6-8", "", 3); }), HasSubstr("frame 3: "));
    EXPECT_THAT(failureOf([&] { exported("6-8x2", "", 2); }), testing::IsEmpty()) << "2 and 4, at its step";
    EXPECT_THAT(failureOf([&] { exported("6-8", "4-12", 3); }), testing::IsEmpty()) << "none before the whole's";
    const auto usage = [&](const std::string& part, const std::string& of) {
        return failureOf([&] { exported(part, of); });
    };
    for (const auto& [part, of] : {std::pair("3-9", "4-12"), std::pair("6-13", "4-12"), std::pair("5-9x2", "4-12"),
                                   std::pair("5-7x2", "4-12x2")})
        EXPECT_THAT(usage(part, of), AllOf(HasSubstr(part), HasSubstr(of), HasSubstr("no run of"))) << part;
}

TEST_F(MergeTest, WhatIsNoWholeIsRefused) {
    save(frames);
    const std::vector<fs::path> good = parts({"1-5", "6-8", "9-12"}, "1-12");
    exported("4-8", "1-12");
    exported("1-5", ""), exported("6-9", "");
    const fs::path &first = good[0], &middle = good[1], &last = good[2];
    const fs::path aside = folder.path() / "aside";
    const fs::path deltas = middle / "deltas.npy", set = folder.path() / "merged";
    struct Case {
        std::vector<fs::path> parts;
        std::function<void()> damage; ///< of the middle part
        std::string error;
    };
    const auto record = [&](const std::function<void(quarn::PartRecord&)>& change) {
        return [=] { changeRecord(middle, change); };
    };
    const std::vector<Case> cases = {
        {{first, last}, {}, "frames 6-8 of 1-12 are in none of the parts"},
        {{first, middle}, {}, "frames 9-12 of 1-12 are in none"},
        {{last, middle}, {}, "frames 1-5 of 1-12 are in none"},
        {{first, middle, last, middle}, {}, "frame 6 is in two parts"},
        {{first, folder.path() / "4-8", last}, {}, "frame 4 is in two parts: " + first.string() + " (1-5)"},
        {{first, folder.path() / "whole 6-9"}, {}, "only one was exported with --of"},
        {{first, folder.path() / "none"}, {}, "none does not exist"},
        {{first, folder.path()}, {}, "is no training data set"},
        {good, record([](auto& r) {
             r.of = {1, 13, 1};
         }),
         "1-5 is a part of 1-12, and "},
        {good, record([](auto& r) { r.build = "0123456789ab"; }), "by 0123456789ab: their rows need not"},
        {good, record([](auto& r) { r.quarn = "7.5"; }), "by 7.5"},
        {good, record([](auto& r) { r.nextSum = "xxh3_128:0"; }),
         "the seam between " + middle.string() + " (6-8) and "},
        {good, record([](auto& r) { r.nextSum = "", r.instructionSet = "odd"; }), "They were made with odd and "},
        {good, record([](auto& r) { r.firstSum = "xxh3_128:0"; }), "its first row is not the one that its record"},
        {good, record([](auto& r) { r.setupSum = ""; }), "part.json and setup.json in " + middle.string()},
        {good, [&] { change(middle / "part.json", "\"version\": 1", "\"version\": 2"); }, "\"version\" is not 1"},
        {good, [&] { put(middle / "part.json", "{"); }, "part.json"},
        {good, [&] { put(middle / "setup.json", "{}"); }, "is no set-up of an export"},
        {good, [&] { change(middle / "dataset.json", "\"metersPerUnit\": 1", "\"metersPerUnit\": 2"); },
         "do not say the same in \"metersPerUnit\""},
        {good, [&] { change(middle / "dataset.json", "\"frameCount\": 3", "\"frameCount\": 9"); }, "speaks of 9 rows"},
        {good, [&] { fs::rename(middle / "dataset.json", middle / "dataset"); }, "is no training data set"},
        {{first, middle / "", last},
         [&] { fs::rename(middle, middle.string() + ".part"); },
         "the export that made it goes on from there"},
        {good, [&] { fs::resize_file(deltas, fs::file_size(deltas) - 1); }, "deltas.npy is damaged: its shape"},
        {good, [&] { change(deltas, "(3, 12, 3)", "(3, 18, 2)"); }, "[3, 12, 3] are meant"},
        {good, [&] { change(deltas, "<f4", "<i4"); }, "where '<f4' in [3, 12, 3]"},
        {good, [&] { fs::remove(middle / "skin.npy"); }, "skin.npy does not exist"},
        {good,
         [&] { fs::copy_file(first / "frames.npy", middle / "frames.npy", fs::copy_options::overwrite_existing); },
         "frames.npy is damaged"},
        {good, [&] { change(middle / "frames.npy", std::string("\7\0\0\0", 4), std::string("\4\0\0\0", 4)); },
         "row 1 is of frame 4, where 7 is meant"},
    };
    fs::copy(middle, aside);
    for (const Case& one : cases) {
        SCOPED_TRACE(one.error);
        if (one.damage)
            one.damage();
        EXPECT_THAT(mergeError(merging(one.parts)), HasSubstr(one.error));
        EXPECT_FALSE(fs::exists(set) || fs::exists(set.string() + ".part")) << "nothing was begun";
        fs::remove_all(middle);
        fs::remove_all(middle.string() + ".part");
        fs::copy(aside, middle);
    }
    EXPECT_EQ(mergeError(merging(good)), "");
}

TEST_F(MergeTest, ASceneThatChangedBetweenPartsIsRefused) {
    save(frames);
    exported("1-5", "1-12");
    save(frames, "setAttr warp.export[0].smoothingIterations 3");
    exported("6-12", "1-12");
    const quarn::MergeOptions flags = merging({folder.path() / "1-5", folder.path() / "6-12"});
    EXPECT_THAT(mergeError(flags), HasSubstr("smoothing iterations is 0 in the first, and 3 in the second"));
    save(frames);
    writeTarget(frames, [](std::size_t, std::vector<float>& xyz) { xyz[0] += 0.01F; });
    fs::remove_all(folder.path() / "6-12");
    exported("6-12", "1-12");
    EXPECT_THAT(mergeError(flags), HasSubstr("file strip.npy of strip_target.cacheFile is "));
}

// without --of, the frames of all are the whole; of the target only the worst is known
TEST_F(MergeTest, PartsWithoutRecordsAreJoinedByTheirFrames) {
    save(frames, "setAttr swing.drawnKeys 1");
    auto expected = contentsOf(exported("1-12", ""));
    quarn::MergeOptions flags = merging({exported("8-12", ""), exported("1-7", "")});
    EXPECT_TRUE(quarn::mergeDatasets(flags).instructionSets.empty());
    auto found = contentsOf(flags.output);
    for (const char* name : {"controls.npy", "deltas.npy", "frames.npy", "skin.npy", "setup.json"})
        EXPECT_EQ(found[name], expected[name]) << name;
    const auto fit = [](const std::string& text) {
        const std::size_t begin = text.find("\"targetFit\"");
        return text.substr(begin, text.find('}', begin) - begin);
    };
    const std::string worst =
        std::max(fit(contentOf(flags.parts[0] / "dataset.json")), fit(contentOf(flags.parts[1] / "dataset.json")));
    std::string rest = expected["dataset.json"];
    rest.replace(rest.find(fit(rest)), fit(rest).size(), worst);
    EXPECT_EQ(found["dataset.json"], rest);
    flags.output = folder.path() / "other";
    flags.parts.push_back(exported("2-4x2", ""));
    EXPECT_THAT(mergeError(flags), HasSubstr("are no run of"));
    flags.parts = {folder.path() / "whole 8-12", exported("1-6", "")};
    EXPECT_THAT(mergeError(flags), HasSubstr("frame 7 of 1-12 is in none of the parts"));
}

TEST_F(MergeTest, WhatIsThereStays) {
    save(frames);
    quarn::MergeOptions flags = merging(parts({"1-6", "7-12"}, "1-12"));
    quarn::ExportOptions other = options();
    other.frames = "1-3";
    other.output = flags.output;
    quarn::exportDatasets(other);
    const auto before = contentsOf(flags.output);
    EXPECT_THAT(mergeError(flags),
                AllOf(HasSubstr("holds another data set (frames 1-3, now 1-12)"), HasSubstr("--overwrite")));
    flags.overwrite = true;
    put(flags.output / "notes.txt", "mine");
    EXPECT_THAT(mergeError(flags), HasSubstr("notes.txt is no part of a training data set"));
    fs::rename(flags.output / "notes.txt", flags.output / ".nfs0000000000000001"); // no matter of ours
    {
        const storage::FolderLock lock(flags.output.string() + ".part", quarn::anotherExport);
        EXPECT_THAT(mergeError(flags), HasSubstr("quarn merge or export is writing"));
    }
    EXPECT_EQ(contentOf(flags.output / "dataset.json"), before.at("dataset.json"));
    EXPECT_EQ(mergeError(flags), "");
    EXPECT_EQ(contentsOf(flags.output), contentsOf(exported("1-12", "")));
    flags.output = flags.parts[0];
    EXPECT_THAT(mergeError(flags), HasSubstr("is one of the parts"));
}

TEST_F(MergeTest, AFullDiskIsSaidBeforeAndMeanwhile) {
    save(frames);
    quarn::MergeOptions flags = merging(parts({"1-6", "7-12"}, "1-12"));
    const fs::path disk = folder.path() / "disk";
    fs::create_directory(disk);
    if (::mount("tmpfs", disk.c_str(), "tmpfs", 0, "size=2m") != 0)
        GTEST_SKIP() << "no small disk to fill: mounting one was refused: " << std::strerror(errno);
    flags.output = disk / "merged";
    put(disk / "other", std::string(std::size_t{2040} << 10U, 'x'));
    EXPECT_THAT(mergeError(flags), HasSubstr("bytes free, and the data set needs 1051"));
    EXPECT_FALSE(fs::exists(disk / "merged.part"));
    fs::remove(disk / "other");
    EXPECT_EQ(mergeError(flags), "");
    ::umount2(disk.c_str(), MNT_DETACH);
}

// killed at any moment, it begins again; the data set that is there is complete at any moment
TEST_F(MergeTest, KilledItBeginsAgain) {
    save(frames);
    const auto expected = contentsOf(exported("1-12", ""));
    quarn::MergeOptions flags = merging(parts({"1-6", "7-12"}, "1-12"));
    flags.overwrite = true;
    quarn::mergeDatasets(flags);
    std::mt19937 random(4);
    for (int kill = 0; kill < 40; ++kill) {
        const pid_t child = ::fork();
        if (child == 0)
            for (;;)
                quarn::mergeDatasets(flags);
        std::this_thread::sleep_for(std::chrono::microseconds(random() % 20000));
        ::kill(child, SIGKILL);
        int status = 0;
        ::waitpid(child, &status, 0);
        EXPECT_TRUE(WIFSIGNALED(status)) << "it ended by itself: an earlier kill has left what it cannot begin on";
        auto found = contentsOf(flags.output);
        for (const auto& [name, bytes] : expected)
            ASSERT_EQ(found[name], bytes) << name;
    }
    quarn::mergeDatasets(flags);
    EXPECT_EQ(contentsOf(flags.output), expected);
    EXPECT_FALSE(fs::exists(flags.output.string() + ".part"));
}

/// Caches as a bake leaves them, with their records.
class MergeCachesTest : public MergeTest {
protected:
    static std::string sumOf(const std::vector<float>& row) { return quarn::rowSum({std::as_bytes(std::span(row))}); }
    fs::path part(int first, int last, const std::string& setting = "1") const {
        fs::path file = folder.path() / (std::to_string(first) + ".npy");
        std::vector<std::vector<float>> rows;
        for (int frame = first; frame <= last; ++frame)
            rows.push_back(targetAt(static_cast<std::size_t>(frame)));
        writeRawCache(file, rows);
        const quarn::PartFrames range = {{first, last, 1}, {1, 9, 1}, true, 0};
        quarn::Setup setup;
        setup.add("setting", setting);
        range.addTo(setup);
        quarn::PartRecord record = quarn::PartRecord::made(range, setup);
        record.setup = setup;
        record.firstSum = sumOf(rows.front());
        if (range.next())
            record.nextSum = sumOf(targetAt(static_cast<std::size_t>(*range.next())));
        put(quarn::PartRecord::besideCache(file), record.json());
        return file;
    }
    std::string whole() const {
        std::vector<std::vector<float>> rows;
        for (std::size_t frame = 1; frame <= 9; ++frame)
            rows.push_back(targetAt(frame));
        writeRawCache(folder.path() / "whole.npy", rows);
        return contentOf(folder.path() / "whole.npy");
    }
    quarn::MergeOptions merging(std::vector<fs::path> parts) const {
        quarn::MergeOptions flags = MergeTest::merging(std::move(parts));
        flags.output = folder.path() / "merged.npy";
        return flags;
    }
    static std::string mergeError(const quarn::MergeOptions& flags) {
        return failureOf([&] { quarn::mergeCaches(flags); });
    }
};

TEST_F(MergeCachesTest, PartsAreOneCache) {
    quarn::MergeOptions flags = merging({part(8, 9), part(1, 1), part(2, 7)});
    EXPECT_FALSE(quarn::mergeCaches(flags).wasComplete);
    EXPECT_EQ(contentOf(flags.output), whole());
    EXPECT_TRUE(quarn::mergeCaches(flags).wasComplete);
    EXPECT_FALSE(fs::exists(flags.output.string() + ".part")) << "the lock";
    change(flags.output, contentOf(flags.output).substr(400, 8), "12345678");
    EXPECT_THAT(mergeError(flags), AllOf(HasSubstr("is not what the parts come to"), HasSubstr("--overwrite")));
    flags.overwrite = true;
    EXPECT_EQ(mergeError(flags), "");
    EXPECT_EQ(contentOf(flags.output), whole());

    // as other programs leave them: in the order that is said, and a single frame without an axis for it
    for (const fs::path& path : flags.parts)
        fs::remove(quarn::PartRecord::besideCache(path));
    change(folder.path() / "1.npy", "(1, 12, 3)", "(12, 3)   ");
    std::rotate(flags.parts.begin(), flags.parts.begin() + 1, flags.parts.end());
    EXPECT_EQ(mergeError(flags), "");
    EXPECT_EQ(contentOf(flags.output), whole());
}

TEST_F(MergeCachesTest, WhatIsNoWholeIsRefused) {
    const fs::path first = part(1, 4), last = part(5, 9);
    const fs::path record = quarn::PartRecord::besideCache(last);
    struct Case {
        std::function<void()> damage; ///< of the last part
        std::string error;
    };
    const std::vector<Case> cases = {
        {[&] { part(5, 8); }, "frame 9 of 1-9 is in none of the parts"},
        {[&] { part(5, 9, "2"); }, "setting is 1 in the first, and 2 in the second"},
        {[&] { change(last, "(5, 12, 3)", "(4, 15, 3)"); }, "12 vertices in '<f4', and "},
        {[&] { change(last, "(5, 12, 3)", "(5, 18, 2)"); }, "is no point cache"},
        {[&] { fs::resize_file(last, 500); }, "5.npy is damaged"},
        {[&] { change(last, contentOf(last).substr(128, 8), "12345678"); }, "its first frame is not the one"},
        {[&] { change(record, "\"frames\": \"5-9\"", "\"frames\": \"5-8\""); }, "it has 5 frames, and its record"},
        {[&] { fs::remove(record); }, "only one has a record beside it"},
        {[&] { fs::rename(last, last.string() + ".part"); }, "the bake that made it goes on from there"},
    };
    for (const Case& one : cases) {
        SCOPED_TRACE(one.error);
        one.damage();
        EXPECT_THAT(mergeError(merging({first, last})), HasSubstr(one.error));
        EXPECT_FALSE(fs::exists(folder.path() / "merged.npy"));
        fs::remove_all(last.string() + ".part");
        part(5, 9);
    }
    quarn::MergeOptions flags = merging({first, last});
    const storage::FolderLock lock(flags.output.string() + ".part", "another");
    EXPECT_THAT(mergeError(flags), HasSubstr("another quarn merge or bake is writing"));
}

} // namespace
