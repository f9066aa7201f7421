// SPDX-License-Identifier: Apache-2.0
// Caches that are gone on from, made in parts, and files of frames that are there.
#include "Movers.h"

#include "quarn/play/GrowingCache.h"
#include "quarn/scene/PartRecord.h"
#include "storage/FolderLock.h"
#include "storage/LockedByAnother.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

#include <fstream>
#include <iterator>
#include <limits>

namespace {

namespace fs = std::filesystem;
using namespace movers;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

std::string contentOf(const fs::path& file) {
    std::ifstream stream(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(stream), {}};
}

void put(const fs::path& file, const std::string& text) {
    std::ofstream(file, std::ios::binary) << text;
}

class GoingOn : public Scene {
protected:
    /// A motion that fails in the frame `bad`, and remembers as many of the frames before as `memory` says.
    GoingOn() {
        plan_ = planOf(mesh("mover",
                            [this](int frame) {
                                if (seen_.empty() || seen_.back() != frame - 1)
                                    seen_.clear();
                                seen_.push_back(frame);
                                double x = frame == bad_ ? std::numeric_limits<double>::quiet_NaN() : frame;
                                for (std::size_t back = 2; back <= memory_ + 1 && back <= seen_.size(); ++back)
                                    x += 0.1 * seen_[seen_.size() - back] / static_cast<double>(back);
                                evaluated_.push_back(frame);
                                return std::vector{0.0, 1.0, x};
                            }),
                       {1, 9, 1});
        plan_.output = output();
    }

    fs::path output() const { return folder_.path() / "a.npy"; }
    fs::path part() const { return folder_.path() / "a.npy.part"; }

    /// Answers with the bytes of the cache, which is gone then.
    std::string played(const PlayPlan& plan) {
        evaluated_.clear();
        seen_.clear();
        result_ = play(plan);
        EXPECT_FALSE(fs::exists(part()));
        std::string bytes = contentOf(output());
        fs::remove(output());
        return bytes;
    }
    std::string played() { return played(plan_); }

    /// What a run leaves that fails in a frame.
    void leave(int bad) {
        bad_ = bad;
        fs::remove_all(part());
        EXPECT_THAT(failureOf([&] { play(plan_); }), HasSubstr("no finite number"));
        bad_ = 0;
        seen_.clear();
    }

    PlayPlan plan_;
    PlayResult result_;
    int bad_ = 0;
    std::size_t memory_ = 0;
    std::vector<int> seen_, evaluated_;
};

TEST_F(GoingOn, MakesTheBytesOfOneRun) {
    const std::string whole = played();
    ASSERT_EQ(whole.size(), 128U + 9 * 36);
    leave(1);
    EXPECT_FALSE(fs::exists(part())) << "nothing to go on from";
    leave(6);
    EXPECT_FALSE(fs::exists(output()));
    EXPECT_EQ(played(), whole);
    EXPECT_THAT(evaluated_, ElementsAre(5, 6, 7, 8, 9)) << "the last one that was there once more";
    EXPECT_EQ(result_.framesKept, 5U);
    EXPECT_EQ(result_.times.count(), 4U);

    // all frames: to compare them, and where the last one that was there comes out otherwise
    leave(6);
    PlayPlan compared = plan_;
    compared.against = plan_.mesh;
    EXPECT_EQ(played(compared), whole);
    EXPECT_EQ(result_.times.count(), 9U);
    memory_ = 2;
    for (const int preroll : {0, 1, 2}) {
        plan_.part.preroll = preroll;
        const std::string remembered = played();
        ASSERT_NE(remembered, whole);
        leave(7);
        EXPECT_EQ(played(), remembered) << preroll;
        EXPECT_EQ(result_.framesKept, preroll == 2 ? 6U : 0U);
    }
}

TEST_F(GoingOn, BeginsAgainWhereItIsDamaged) {
    const std::string whole = played();
    const fs::path points = part() / "points.npy", setup = part() / "setup.json";
    const auto flip = [](const fs::path& file, std::size_t at) {
        std::string bytes = contentOf(file);
        bytes.at(at) ^= 1;
        put(file, bytes);
    };
    const std::vector<std::function<void()>> damages = {
        [&] { flip(points, 200); },
        [&] { fs::remove(points); },
        [&] { fs::resize_file(points, 150); },
        [&] { fs::remove(points), fs::create_directory(points); },
        [&] { fs::remove(part() / "progress.json"); },
        [&] { put(part() / "progress.json", R"({"rows": 10, "sums": [""]})"); },
        [&] { put(setup, contentOf(setup).substr(0, 40)); },
        [&] { flip(setup, contentOf(setup).find("\"vertices\": \"3") + 13); }, // 2 of them
    };
    for (std::size_t i = 0; i < damages.size(); ++i) {
        SCOPED_TRACE(i);
        leave(6);
        damages[i]();
        EXPECT_EQ(played(), whole);
        EXPECT_EQ(result_.framesKept, 0U);
    }
    leave(6); // a row and a half behind the record are no damage
    std::ofstream(points, std::ios::binary | std::ios::app) << std::string(50, 'x');
    EXPECT_EQ(played(), whole);
    EXPECT_EQ(result_.framesKept, 5U);
}

TEST_F(GoingOn, NeverMixesTwoSetUpsOrTakesWhatIsNotItsOwn) {
    const PlayPlan asked = plan_;
    const std::vector<std::pair<std::function<void()>, std::string>> changes = {
        {[&] { plan_.frames.last = 10; }, "frames 1-9, now 1-10"},
        {[&] { plan_.space.scale = 0.1; }, "scale 1, now 0.1"},
        {[&] { plan_.space.axes = "z"; }, "axes y, now z"},
        {[&] { plan_.mesh = mesh("other", [](int) {
                   return std::vector{0.0, 1.0, 2.0};
               }); },
         "plug mover.outMesh, now"},
        {[&] { plan_.isOnGpu = true; }, "evaluator cpu, now gpu"},
        {[&] { plan_.model.name = "one"; }, "model (none), now one"},
        {[&] { plan_.part.preroll = 1; }, "preroll (none), now 1"},
    };
    for (const auto& [change, words] : changes) {
        plan_ = asked;
        leave(4);
        change();
        EXPECT_THAT(failureOf([&] { play(plan_); }), HasSubstr("begun with another set-up (" + words));
    }
    plan_.replacesBegun = true;
    played();
    plan_ = asked;

    leave(4);
    put(part() / "notes.txt", "mine");
    EXPECT_THAT(failureOf([&] { play(plan_); }), HasSubstr("notes.txt is no part of a point cache"));
    fs::remove(part() / "notes.txt");
    {
        const storage::FolderLock other(part(), "another");
        EXPECT_THROW(play(plan_), storage::LockedByAnother);
    }
    played();

    // a link stays one, and permissions stay
    put(folder_.path() / "real.npy", "old");
    fs::permissions(folder_.path() / "real.npy", fs::perms::owner_read | fs::perms::owner_write);
    fs::create_symlink("real.npy", output());
    put(PartRecord::besideCache(folder_.path() / "real.npy"), "of before");
    play(plan_);
    EXPECT_TRUE(fs::is_symlink(output()));
    EXPECT_EQ(fs::file_size(folder_.path() / "real.npy"), 128U + 9 * 36);
    EXPECT_EQ(fs::status(output()).permissions(), fs::perms::owner_read | fs::perms::owner_write);
    EXPECT_EQ(std::distance(fs::directory_iterator(folder_.path()), {}), 2) << "nothing is left, the record neither";
}

TEST_F(GoingOn, PartsTellTheirSeams) {
    memory_ = 2;
    const std::string whole = played();
    const auto sumOf = [&](int frame) {
        return rowSum({std::as_bytes(std::span(whole).subspan(128 + static_cast<std::size_t>(frame - 1) * 36, 36))});
    };
    const fs::path beside = PartRecord::besideCache(output());
    const auto made = [&](FrameRange frames, int preroll) {
        plan_.frames = frames;
        plan_.part = {"1-9", preroll};
        const std::string bytes = played();
        EXPECT_EQ(bytes.substr(0, 128).find("'shape': (" + std::to_string(frames.count()) + ", 3, 3)") ==
                      std::string::npos,
                  false);
        const std::string rows =
            whole.substr(128 + static_cast<std::size_t>(frames.first - 1) * 36, frames.count() * 36);
        EXPECT_EQ(bytes.substr(128) == rows, preroll == 2 || frames.first == 1);
        return PartRecord::read(beside).value();
    };
    const PartRecord first = made({1, 3, 1}, 2);
    EXPECT_EQ(first.firstSum, sumOf(1));
    EXPECT_EQ(first.nextSum, sumOf(4));
    EXPECT_THAT(evaluated_, ElementsAre(1, 2, 3, 4));
    const PartRecord last = made({4, 9, 1}, 2);
    EXPECT_EQ(last.firstSum, sumOf(4));
    EXPECT_EQ(last.nextSum, std::nullopt);
    EXPECT_THAT(evaluated_, ElementsAre(2, 3, 4, 5, 6, 7, 8, 9));
    EXPECT_EQ(first.setupSum, last.setupSum);
    EXPECT_EQ(first.setup->json(), last.setup->json());
    const PartRecord forgetful = made({4, 6, 1}, 0);
    EXPECT_EQ(forgetful.setupSum, first.setupSum) << "how a part was made is no set-up";
    EXPECT_NE(forgetful.firstSum, first.nextSum) << "the seam that merge refuses";

    // killed in the middle, and after its last frame: the same record
    const std::string record = contentOf(beside);
    for (const int bad : {6, 7}) {
        plan_.frames = {4, 6, 1};
        plan_.part = {"1-9", 2};
        leave(bad);
        played();
        EXPECT_EQ(PartRecord::read(beside)->firstSum, sumOf(4));
        EXPECT_EQ(PartRecord::read(beside)->nextSum, sumOf(7));
    }
    plan_.output = folder_.path() / "a.pc2";
    EXPECT_THAT(failureOf([&] { play(plan_); }), HasSubstr("--of goes with -o FILE.npy"));
}

TEST_F(GoingOn, FilesThatAreThereStay) {
    memory_ = 1;
    plan_.output = folder_.path() / "a.####.obj";
    play(plan_);
    const std::string fifth = contentOf(folder_.path() / "a.0005.obj");
    for (const char* name : {"a.0002.obj", "a.0005.obj", "a.0006.obj"})
        fs::remove(folder_.path() / name);
    put(folder_.path() / "a.0004.obj", "mine");
    plan_.leavesExisting = true;
    plan_.part.preroll = 1;
    evaluated_.clear();
    seen_.clear();
    const PlayResult result = play(plan_);
    EXPECT_THAT(evaluated_, ElementsAre(1, 2, 4, 5, 6)) << "what a frame remembers is evaluated before it";
    EXPECT_EQ(result.times.count(), 3U);
    EXPECT_EQ(result.framesSkipped, 6U);
    EXPECT_EQ(contentOf(folder_.path() / "a.0004.obj"), "mine");
    EXPECT_EQ(contentOf(folder_.path() / "a.0005.obj"), fifth);
    evaluated_.clear();
    EXPECT_EQ(play(plan_).framesSkipped, 9U);
    EXPECT_THAT(evaluated_, IsEmpty());

    PlayPlan bad = plan_;
    bad.repeats = 2;
    EXPECT_THAT(failureOf([&] { play(bad); }), HasSubstr("and all frames are played several times"));
    bad = plan_;
    bad.output = output();
    EXPECT_THAT(failureOf([&] { play(bad); }), HasSubstr("--skip-existing goes with a file for each frame"));
}

} // namespace
