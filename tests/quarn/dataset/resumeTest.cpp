// SPDX-License-Identifier: Apache-2.0
// Going on after an end that came too early, and everything that must not be gone on from.
#include "quarn/dataset/ExportScene.h"

#include "quarn/dataset/DatasetFolder.h"
#include "quarn/dataset/DatasetWriter.h"
#include "storage/FolderLock.h"
#include "storage/WholeFile.h"

#include <cerrno>
#include <cstring>
#include <fstream>
#include <functional>
#include <limits>

#include <sys/mount.h>

namespace {

namespace fs = std::filesystem;
using ::testing::AllOf;
using ::testing::HasSubstr;

constexpr std::size_t frames = 8;
constexpr float notANumber = std::numeric_limits<float>::quiet_NaN();

class ResumeTest : public ExportScene {
protected:
    ResumeTest() {
        writeTarget(frames);
        save(frames);
        expected_ = exported();
        fs::rename(data(), folder.path() / "whole");
    }

    fs::path part() const { return folder.path() / "data" / "strip.part"; }

    std::map<std::string, std::string> exported() const {
        rowsBefore_ = quarn::exportDatasets(options()).at(0).rowsBefore;
        EXPECT_FALSE(fs::exists(part()));
        return contentsOf(data());
    }

    /// FOLDER.part as a process that was killed after `rows` rows leaves it, with a row and a half behind them.
    void leavePart(std::size_t rows) {
        fs::remove_all(data());
        fs::remove_all(part());
        fs::create_directories(part());
        fs::copy_file(folder.path() / "whole" / "setup.json", part() / "setup.json");
        quarn::DatasetWriter writer(part(), {frames, 8, vertexCount});
        writer.begin();
        const std::vector<float> controls = numbersOf<float>(folder.path() / "whole" / "controls.npy");
        const std::vector<float> deltas = numbersOf<float>(folder.path() / "whole" / "deltas.npy");
        const std::vector<float> skin = numbersOf<float>(folder.path() / "whole" / "skin.npy");
        for (std::size_t row = 0; row <= rows; ++row) {
            if (row == rows)
                writer.save();
            writer.append(static_cast<int>(row) + 1, std::span(controls).subspan(row * 8, 8),
                          std::span(deltas).subspan(row * 36, 36), std::span(skin).subspan(row * 12, 12));
        }
        if (rows + 1 < frames)
            std::ofstream(part() / "deltas.npy", std::ios::binary | std::ios::app) << "half a row";
        const fs::path left = storage::WholeFile(part() / "progress.json").temporary();
        std::ofstream(left) << "{";
    }

    std::map<std::string, std::string> expected_;
    mutable std::size_t rowsBefore_ = 0;
};

TEST_F(ResumeTest, GoesOnFromTheRecordedRows) {
    EXPECT_EQ(expected_.size(), 6U);
    for (const std::size_t rows : {0U, 1U, 5U, 7U}) {
        leavePart(rows);
        EXPECT_EQ(exported(), expected_) << rows;
        EXPECT_EQ(rowsBefore_, rows);
    }
    EXPECT_EQ(exported(), expected_);
    EXPECT_EQ(rowsBefore_, frames) << "complete: nothing was done";
}

TEST_F(ResumeTest, BeginsAgainWhereItIsDamaged) {
    const auto put = [](const fs::path& file, const std::string& text) {
        std::ofstream(file, std::ios::binary) << text;
    };
    const auto flip = [&](const fs::path& file, std::size_t at) {
        std::string bytes = contentOf(file);
        bytes.at(at) ^= 1;
        put(file, bytes);
    };
    const fs::path progress = part() / "progress.json", deltas = part() / "deltas.npy", setup = part() / "setup.json";
    const std::vector<std::function<void()>> damages = {
        [&] { fs::resize_file(deltas, 300); },
        [&] { fs::resize_file(deltas, 1U << 20U); },
        [&] { flip(part() / "controls.npy", 3); },
        [&] { fs::remove(part() / "frames.npy"); },
        [&] { flip(part() / "skin.npy", 130); },
        [&] { fs::remove(deltas), fs::create_directory(deltas); },
        [&] { fs::remove(progress); },
        [&] { put(progress, "{\"rows\": 99, \"sums\": [\"\", \"\", \"\", \"\"]}"); },
        [&] { put(progress, "{\"rows\": -1, \"sums\": 3}"); },
        [&] { put(progress, "{\"rows\": 2, \"sums\": [1, 2, 3, 4]}"); },
        [&] { put(progress, std::string(1U << 20U, '[')); },
        [&] { put(setup, "{\"frames\": 3}"); },
        [&] { put(setup, contentOf(setup).substr(0, 50)); },
    };
    for (std::size_t i = 0; i < damages.size(); ++i) {
        SCOPED_TRACE(i);
        leavePart(5);
        damages[i]();
        EXPECT_EQ(exported(), expected_);
        EXPECT_EQ(rowsBefore_, 0U);
    }
}

TEST_F(ResumeTest, NeverMixesTwoSetUps) {
    quarn::ExportOptions flags = options();
    flags.frames = "1-9";
    leavePart(5);
    EXPECT_THAT(errorOf(flags), AllOf(HasSubstr("(frames 1-8, now 1-9)"), HasSubstr("--overwrite")));
    exported();
    EXPECT_THAT(errorOf(flags), AllOf(HasSubstr("(frames 1-8, now 1-9)"), HasSubstr("--overwrite")));
    EXPECT_EQ(contentsOf(data()), expected_);

    save(frames, "setAttr warp.export[0].smoothingIterations 3");
    EXPECT_THAT(errorOf(options()), HasSubstr("(smoothing iterations "));
    save(frames);

    writeTarget(frames, [](std::size_t frame, std::vector<float>& xyz) { xyz[0] = frame == 6 ? notANumber : 0.1F; });
    EXPECT_THAT(errorOf(options()), HasSubstr("file strip.npy of strip_target.cacheFile"));
    flags.overwrite = true;
    EXPECT_THAT(errorOf(flags), HasSubstr("frame 7"));
    EXPECT_EQ(contentsOf(data()), expected_) << "the old one stays until the new one is complete";
    writeTarget(frames + 1);
    quarn::exportDatasets(flags);
    EXPECT_EQ(numbersOf<int>(data() / "frames.npy").size(), 9U);
    EXPECT_EQ(std::distance(fs::directory_iterator(folder.path() / "data"), {}), 1) << "the old one has gone";
}

TEST_F(ResumeTest, TouchesNothingThatIsNotItsOwn) {
    quarn::ExportOptions flags = options();
    flags.overwrite = true;
    exported();
    std::ofstream(data() / "notes.txt") << "mine";
    EXPECT_THAT(errorOf(flags), HasSubstr("notes.txt is no part of a training data set"));
    fs::remove(data() / "dataset.json");
    EXPECT_THAT(errorOf(flags), HasSubstr("is no training data set"));
    fs::remove_all(data());
    leavePart(3);
    std::ofstream(part() / "notes.txt") << "mine";
    EXPECT_THAT(errorOf(flags), HasSubstr("notes.txt"));
    EXPECT_EQ(contentOf(part() / "notes.txt"), "mine");
}

TEST_F(ResumeTest, OneAtATime) {
    leavePart(3);
    {
        const storage::FolderLock other(part(), quarn::anotherExport);
        EXPECT_THAT(errorOf(options()), HasSubstr("another quarn export is writing"));
    }
    EXPECT_EQ(exported(), expected_);
}

TEST_F(ResumeTest, AFullDiskIsSaidAndGoneOnFrom) {
    const fs::path disk = folder.path() / "disk";
    fs::create_directory(disk);
    if (::mount("tmpfs", disk.c_str(), "tmpfs", 0, "size=4m") != 0)
        GTEST_SKIP() << "no small disk to fill: mounting one was refused: " << std::strerror(errno);
    constexpr quarn::DatasetShape shape{300, 4, 500}; // 2.4 MB
    const std::vector<float> controls(4, 1.0F), deltas(1500, 2.0F), skin(500, 3.0F);
    const auto appendAll = [&](quarn::DatasetWriter& writer) {
        while (writer.rows() < shape.rows)
            writer.append(1, controls, deltas, skin);
        writer.save();
    };
    quarn::DatasetWriter stopped(disk, shape);
    stopped.begin();
    stopped.append(1, controls, deltas, skin);
    stopped.save();
    std::ofstream(disk / "other") << std::string(3U << 20U, 'x');
    EXPECT_THAT(failureOf([&] { appendAll(stopped); }),
                AllOf(HasSubstr(disk.string()), HasSubstr("No space left on device")));
    const std::size_t saved = stopped.savedRows();
    fs::remove(disk / "other");
    stopped.save(); // of the row that has no room, a part is written, and that is nothing to record
    quarn::DatasetWriter writer(disk, shape);
    EXPECT_EQ(writer.resume(), "");
    EXPECT_GT(saved, 0U);
    EXPECT_EQ(writer.rows(), saved);
    appendAll(writer);
    EXPECT_EQ(numbersOf<float>(disk / "deltas.npy"), std::vector<float>(std::size_t{300} * 1500, 2.0F));

    // and before anything is begun: this needs more than there is
    quarn::ExportOptions flags = options();
    flags.output = disk / "data";
    flags.frames = "1-20000";
    EXPECT_THAT(errorOf(flags), AllOf(HasSubstr("bytes free"), HasSubstr("needs 5608576")));
    ::umount2(disk.c_str(), MNT_DETACH);
}

} // namespace
