// SPDX-License-Identifier: Apache-2.0
// Point caches in all formats: what other programs write is read, what is written is read back, and a file that is not
// what it says is refused.
#include "fuzz/cacheTarget.h"
#include "libraries/storage/StorageTest.h"
#include "support/seedCorpus.h"

#include "storage/PointCache.h"
#include "storage/PointCacheWriter.h"
#include "storage/byteOrder.h"

#include <bit>
#include <cmath>
#include <limits>
#include <random>

namespace {

using storage::CacheTiming;
using storage::openPointCache;
using storage::PointCache;
using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

std::vector<double> frameOf(const PointCache& file, std::size_t frame) {
    std::vector<double> xyz(3 * file.vertexCount());
    file.read(frame, 0, xyz);
    return xyz;
}

const std::string endings[] = {".npy", ".npz", ".pc2", ".MDD"};

class PointCaches : public StorageTest {
protected:
    std::string path(const std::string& name) const { return StorageTest::path(name); }

    /// The bytes of a file of two frames of two vertices that another program wrote: [[1, 2.5, -3], [0.1, 5, 6]] and
    /// [[4, 5, 0.1], [7, 8, -9]]. Python's struct, numpy.savez and numpy.savez_compressed are such programs.
    static std::string foreign(const std::string& seed) {
        std::ifstream file(std::filesystem::path(NW_FUZZ_CORPUS) / "fuzz_cache" / seed, std::ios::binary);
        const std::string bytes{std::istreambuf_iterator<char>(file), {}};
        return bytes.substr(1); // behind the mark of its format
    }
    /// Why the bytes are refused as a file of that ending.
    std::string refusal(const std::string& bytes, const std::string& ending) const {
        put("cache" + ending, bytes);
        const std::string why = failureOf([&] { openPointCache(path("cache" + ending)); });
        EXPECT_THAT(why, HasSubstr("point cache '" + path("cache" + ending) + "' cannot be read: "));
        return why;
    }
};

const std::pair<const char*, const char*> foreignFiles[] = {{"accepted_pc2", ".pc2"},
                                                            {"accepted_mdd", ".mdd"},
                                                            {"accepted_npz_stored", ".npz"},
                                                            {"accepted_npz_deflated", ".npz"}};

TEST_F(PointCaches, OfOtherProgramsAreRead) {
    for (const auto& [seed, ending] : foreignFiles) {
        SCOPED_TRACE(seed);
        put(std::string("cache") + ending, foreign(seed));
        const auto cache = openPointCache(path(std::string("cache") + ending));
        ASSERT_EQ(cache->frameCount(), 2U);
        ASSERT_EQ(cache->vertexCount(), 2U);
        EXPECT_THAT(frameOf(*cache, 0), ElementsAre(1, 2.5, -3, 0.1F, 5, 6));
        EXPECT_THAT(frameOf(*cache, 1), ElementsAre(4, 5, 0.1F, 7, 8, -9));
        double second[3];
        cache->read(1, 1, second);
        EXPECT_THAT(second, ElementsAre(7, 8, -9));
        EXPECT_THROW(cache->read(2, 0, second), std::out_of_range);
        const bool isPc2 = std::string(ending) == ".pc2", isMdd = std::string(ending) == ".mdd";
        EXPECT_EQ(cache->firstFrame(), isPc2 ? std::optional(10.0) : std::nullopt);
        EXPECT_EQ(cache->frameStep(), isPc2 ? std::optional(0.5) : std::nullopt);
        EXPECT_EQ(cache->secondsOf(1), isMdd ? std::optional<double>(1.0F / 24.0F) : std::nullopt);
    }
}

// as modellers write them: with normals, colours, a fourth coordinate, returns and marks
TEST_F(PointCaches, InTextAreReadByVertex) {
    put("a_#.08.obj", "# made\r\nmtllib v.mtl\r\nv 1 2.5 -3\r\nvn 9 9 9\r\n\tv\t+0.1 5e0 6 1.0\r\nf 1 2 1");
    put("a_#.10.obj", "v 4 5 0.1 0.5 0.5 0.5\nvt 0 0\nv 7 8 -9");
    put("a_#.12.obj", "v -0 1e-45 3.4028235e38\nv 0 0 1e-60\n");
    put("a_#.9.obj", "not of two digits");
    put("a_1.08.obj", "of another name");
    const auto cache = openPointCache(path("a_#.##.obj"));
    EXPECT_EQ(cache->vertexCount(), 2U);
    ASSERT_EQ(cache->frameCount(), 3U);
    EXPECT_EQ(cache->firstFrame(), 8.0);
    EXPECT_EQ(cache->frameStep(), 2.0);
    EXPECT_THAT(frameOf(*cache, 0), ElementsAre(1, 2.5, -3, 0.1F, 5, 6));
    EXPECT_THAT(frameOf(*cache, 1), ElementsAre(4, 5, 0.1F, 7, 8, -9));
    EXPECT_THAT(frameOf(*cache, 2),
                ElementsAre(0, std::numeric_limits<float>::denorm_min(), std::numeric_limits<float>::max(), 0, 0, 0));
    EXPECT_TRUE(std::signbit(frameOf(*cache, 2)[0]));
    EXPECT_EQ(openPointCache(path("a_#.10.obj"))->frameCount(), 1U) << "a file that has such a name";

    put("b.1.obj", "v 1 2 3");
    put("b.2.obj", "v 1 2 3");
    put("b.5.obj", "v 1 2 3");
    put("b.9.obj", "v 1 2 3");
    put("c.-1.obj", "v 1 2 3");
    put("c.0.obj", "v 1 2 3\nv 4 5 6");
    put("d.1.obj", "v 1 2 3");
    put("d.2.obj", "v 1 2 3\nv 1 2,5 3");
    const std::pair<const char*, const char*> rows[] = {
        {"none.###.obj", "no file of such a name with a number in place of #, as none.001.obj"},
        {"b.#.obj", "of its frames 1-9 there are no files of 3-4, 6-8"},
        {"c.#.obj", "c.0.obj has 2 vertices, and the first file has 1"},
        {"d.#.obj", "d.2.obj: its line 2 is no vertex: \"v 1 2,5 3\""},
        {"none.obj", "none.obj"}};
    for (const auto& [name, why] : rows)
        EXPECT_THAT(failureOf([&, &file = name] { openPointCache(path(file)); }),
                    AllOf(HasSubstr("point cache '" + path(name) + "' cannot be read: "), HasSubstr(why)));
}

// nobody here looks at the sum of a stored array, and NumPy does
TEST_F(PointCaches, OfNumPyHaveItsSum) {
    const auto writer = storage::createPointCache(path("own.npz"), 2, {.frameCount = 2});
    writer->append(std::vector<float>{1, 2.5, -3, 0.1F, 5, 6});
    writer->append(std::vector<float>{4, 5, 0.1F, 7, 8, -9});
    writer->finish();
    const auto sum = [](const std::string& bytes) { return storage::littleAt<std::uint32_t>(bytes, 14); };
    EXPECT_EQ(sum(content("own.npz")), sum(foreign("accepted_npz_stored")));
}

// nowhere is a byte missing or too many without a word
TEST_F(PointCaches, CutShortOrLongerAreRefused) {
    for (const auto& [seed, ending] : foreignFiles) {
        const std::string whole = foreign(seed);
        for (std::size_t length = 0; length < whole.size(); ++length)
            refusal(whole.substr(0, length), ending);
        refusal(whole + '\0', ending);
    }
}

std::string with(std::string bytes, std::size_t place, const std::string& other) {
    return bytes.replace(place, other.size(), other);
}

TEST_F(PointCaches, ThatAreNotWhatTheySayAreRefused) {
    const std::string pc2 = foreign("accepted_pc2"), mdd = foreign("accepted_mdd");
    const std::string stored = foreign("accepted_npz_stored"), deflated = foreign("accepted_npz_deflated");
    const std::string ones(4, '\xff'), most("\xff\xff\xff\x7f"), nan("\0\0\xc0\x7f", 4), zeros(4, '\0');
    const std::size_t storedEntry = stored.find("PK\x01\x02"), deflatedEntry = deflated.find("PK\x01\x02");
    const std::size_t end = stored.find("PK\x05\x06");
    const struct {
        std::string bytes, ending;
        const char* why;
    } rows[] = {
        {with(pc2, 0, "POINTCACHE3"), ".pc2", "does not begin with"},
        {mdd, ".pc2", "does not begin with"},
        {pc2.substr(0, 31), ".pc2", "its head takes 32 bytes, and it has 31"},
        {with(pc2, 12, std::string("\2")), ".pc2", "version is 2"},
        {with(pc2, 16, ones), ".pc2", "number of vertices is -1"},
        {with(pc2, 20, nan), ".pc2", "first sample is no finite number"},
        {with(pc2, 24, nan), ".pc2", "to the next is no finite number"},
        {with(pc2, 28, std::string("\3")), ".pc2", "its shape is [3, 2, 3] of 4 bytes each, and 48 bytes follow"},
        {with(with(pc2, 16, most), 28, most), ".pc2", "cut short: its shape is [2147483647, 2147483647, 3]"},
        {with(mdd, 0, ones), ".mdd", "no MDD file: its number of frames is -1"},
        {with(mdd, 4, ones), ".mdd", "no MDD file: its number of vertices is -1"},
        {with(mdd, 3, std::string("\3")), ".mdd", "cut short: its shape is [3, 2, 3] of 4 bytes each, and 44 bytes"},
        {std::string("\x7f\xff\xff\xff\0\0\0\0", 8), ".mdd", "no times for its 2147483647 frames"},
        {std::string(8, '\x7f'), ".mdd", "cut short"},
        {foreign("refused_npz_two_arrays"), ".npz", "it has 2 arrays"},
        {with(stored, stored.rfind(".npy"), ".txt"), ".npz", "it has 0 arrays"},
        {with(stored, storedEntry + 8, std::string("\1")), ".npz", "encrypted"},
        {with(stored, storedEntry + 10, "\x0c"), ".npz", "method 12"},
        {with(stored, storedEntry + 24, std::string("\1")), ".npz", "two sizes, 1 and 176 bytes"},
        {with(with(stored, storedEntry + 24, most), storedEntry + 20, most), ".npz", "to take 2147483647 bytes"},
        {with(stored, storedEntry + 42, most), ".npz", "its member lies beyond its end"},
        {with(stored, storedEntry + 42, "\1"), ".npz", "its member does not begin as one"},
        {with(stored, storedEntry + 28, ones), ".npz", "ends within a member"},
        {with(stored, storedEntry, zeros), ".npz", "its directory does not begin as one"},
        {with(stored, end + 12, most), ".npz", "its directory takes 2147483647 bytes: at most 1048576"},
        {with(stored, end + 16, most), ".npz", "its directory lies beyond its end"},
        {with(deflated, deflatedEntry + 24, ones), ".npz", "4294967295 bytes"},
        {with(deflated, deflatedEntry + 24, "\1"), ".npz", "cannot be unpacked"},
        {with(deflated, deflatedEntry + 16, zeros), ".npz", "cannot be unpacked"},
        {foreign("refused_npz_damaged"), ".npz", "cannot be unpacked"},
        {"v 1 2", ".obj", "line 1 is no vertex"},
        {"v 1 2 x", ".obj", "line 1 is no vertex"},
        {"v 1 2 3x", ".obj", "line 1 is no vertex"},
        {"v 1 1e999 3", ".obj", "line 1 is no vertex"},
        {"vn 1 2 3\nf 1 1 1", ".obj", "it has no vertices"},
    };
    for (const auto& row : rows)
        EXPECT_THAT(refusal(row.bytes, row.ending), HasSubstr(row.why));
    EXPECT_THAT(refusal("", ".abc"), HasSubstr(".npy, .npz, .pc2, .mdd or .obj"));
    put("cache.mdd", with(mdd, 12, std::string("\x7f\xc0\0\0", 4)));
    const auto cache = openPointCache(path("cache.mdd"));
    EXPECT_THAT(failureOf([&] { static_cast<void>(cache->secondsOf(1)); }),
                HasSubstr("time of its frame 1 is no finite number"));
}

TEST_F(PointCaches, WhatIsWrittenIsReadBackToTheBit) {
    std::mt19937 random(20);
    const auto anyFloat = [&] { return std::bit_cast<float>(static_cast<std::uint32_t>(random()) & 0xFF7FFFFFU); };
    for (const std::string& ending : endings)
        for (const std::size_t frames : {0U, 1U, 3U})
            for (const std::size_t vertices : {0U, 1U, 5U, 4096U, 4097U, 10000U}) {
                SCOPED_TRACE(ending + ", " + std::to_string(frames) + " frames, " + std::to_string(vertices));
                const std::string file = path("cache" + ending);
                std::vector<std::vector<float>> given(frames, std::vector<float>(3 * vertices));
                const auto writer = storage::createPointCache(file, vertices, {frames, -4.0, 2.0, 25.0});
                for (std::vector<float>& frame : given) {
                    std::generate(frame.begin(), frame.end(), anyFloat);
                    writer->append(frame);
                }
                writer->finish();
                const auto cache = openPointCache(file);
                ASSERT_EQ(cache->frameCount(), frames);
                ASSERT_EQ(cache->vertexCount(), vertices);
                EXPECT_EQ(cache->firstFrame().value_or(-4.0), -4.0);
                EXPECT_EQ(cache->frameStep().value_or(2.0), 2.0);
                for (std::size_t frame = 0; frame < frames; ++frame) {
                    EXPECT_EQ(frameOf(*cache, frame), std::vector<double>(given[frame].begin(), given[frame].end()));
                    const double seconds = (2.0 * static_cast<double>(frame) - 4.0) / 25.0;
                    EXPECT_EQ(cache->secondsOf(frame).value_or(seconds),
                              ending == ".MDD" ? static_cast<double>(static_cast<float>(seconds)) : seconds);
                }
                if (frames > 1 && vertices > 4) { // a part of a frame that is not the first
                    double part[6];
                    cache->read(1, 2, part);
                    EXPECT_TRUE(std::equal(std::begin(part), std::end(part), given[1].begin() + 6));
                }
            }
    EXPECT_EQ(names().size(), std::size(endings));
}

TEST_F(PointCaches, ThatCannotBeWrittenLeaveNothing) {
    const CacheTiming timing{.frameCount = 2};
    const auto writer = storage::createPointCache(path("short.mdd"), 1, timing);
    writer->append(std::vector<float>{1, 2, 3});
    EXPECT_THAT(failureOf([&] { writer->finish(); }), AllOf(HasSubstr("2 frames"), HasSubstr("has got 1")));
    for (const char* ending : {".pc2", ".mdd"})
        EXPECT_THAT(
            failureOf([&] { storage::createPointCache(path(std::string("large") + ending), 1U << 31U, timing); }),
            AllOf(HasSubstr("large"), HasSubstr("2147483648 vertices"), HasSubstr("2147483647")));
    EXPECT_THAT(failureOf([&] { storage::createPointCache(path("cache.abc"), 1, timing); }),
                AllOf(HasSubstr("cache.abc"), HasSubstr(".npy, .npz, .pc2 or .mdd")));
    EXPECT_FALSE(std::filesystem::exists(path("short.mdd")));
}

TEST(CacheSeeds, AreAcceptedOrRefusedAsTheirNamesSay) {
    EXPECT_EQ(runSeedCorpus("fuzz_cache", fuzzCache), 5);
}

} // namespace
