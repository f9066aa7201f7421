// SPDX-License-Identifier: Apache-2.0
// Point caches as files: what is read, what is refused and why, and what is left when writing fails.
#include "fuzz/npyTarget.h"
#include "libraries/storage/StorageTest.h"
#include "support/seedCorpus.h"

#include "storage/NpyFile.h"
#include "storage/NpyWriter.h"
#include "storage/finite.h"
#include "storage/npyArray.h"

#include <cfloat>
#include <cmath>

namespace {

using storage::NpyFile;
using storage::NpyWriter;
using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

std::vector<double> frameOf(const NpyFile& file, std::size_t frame) {
    std::vector<double> xyz(3 * file.vertexCount());
    file.read(frame, 0, xyz);
    return xyz;
}

/// A file of format version `major`.0 with that header and so many bytes of zeros behind it.
std::string npy(const std::string& dictionary, std::size_t dataSize, char major = 1) {
    std::string bytes = "\x93NUMPY";
    bytes += {major, '\0', static_cast<char>(dictionary.size()), '\0'};
    return bytes + std::string(major == 1 ? 0 : 2, '\0') + dictionary + std::string(dataSize, '\0');
}

class NpyFiles : public StorageTest {
public:
    std::string path(const std::string& name = "cache.npy") const { return StorageTest::path(name); }
    std::string write(const std::string& bytes) const {
        put("cache.npy", bytes);
        return path();
    }
};

// the bytes that numpy.save writes for [[[1, 2.5, -3]], [[4, 5, 0.1]]] as '<f4', and [[0.1, -2, 3]] as '<f8'
constexpr char numpySingles[] = "\x93NUMPY\x01\0v\0{'descr': '<f4', 'fortran_order': False, 'shape': (2, 1, 3), }"
                                "                                                       \n"
                                "\0\0\x80\x3f\0\0\x20\x40\0\0\x40\xc0\0\0\x80\x40\0\0\xa0\x40\xcd\xcc\xcc\x3d";
constexpr char numpyDoubles[] = "\x93NUMPY\x01\0v\0{'descr': '<f8', 'fortran_order': False, 'shape': (1, 3), }"
                                "                                                          \n"
                                "\x9a\x99\x99\x99\x99\x99\xb9\x3f\0\0\0\0\0\0\0\xc0\0\0\0\0\0\0\x08\x40";

TEST_F(NpyFiles, ReadsWhatNumpySaves) {
    const NpyFile singles(write({numpySingles, sizeof(numpySingles) - 1}));
    EXPECT_EQ(singles.frameCount(), 2U);
    EXPECT_EQ(singles.vertexCount(), 1U);
    EXPECT_THAT(frameOf(singles, 0), ElementsAre(1, 2.5, -3));
    EXPECT_THAT(frameOf(singles, 1), ElementsAre(4, 5, 0.1F));
    const NpyFile doubles(write({numpyDoubles, sizeof(numpyDoubles) - 1}));
    EXPECT_EQ(doubles.frameCount(), 1U);
    EXPECT_THAT(frameOf(doubles, 0), ElementsAre(0.1, -2, 3));
}

struct Refused {
    std::string bytes;
    const char* why;
};

TEST_F(NpyFiles, RefusesWhatIsNoPointCache) {
    const auto shaped = [](const std::string& shape, std::size_t dataSize) {
        return npy("{'descr': '<f4', 'fortran_order': False, 'shape': " + shape + "}", dataSize);
    };
    const std::string good = npy("{'descr': '<f4', 'fortran_order': False, 'shape': (1, 3), } \n", 12);
    write(good);
    ASSERT_EQ(failureOf([&] { NpyFile{path()}; }), "") << "the rows differ from this one by what is wrong";
    const std::vector<Refused> rows = {
        {"", "does not begin with"},
        {"\x93NUMPX" + good.substr(6), "does not begin with"},
        {good.substr(0, 11), "ends within its first 12 bytes"},
        {good.substr(0, 40), "its header is to end at byte 71, and it has 40"},
        {npy("{", 0, 4), "version 4.0"},
        {std::string("\x93NUMPY\x02\0\xff\xff\xff\x7f", 12), "2147483647 bytes: at most 65536"},
        {good.substr(0, good.size() - 1), "[1, 1, 3] of 4 bytes each, and 11 bytes follow"},
        {good + '\0', "more than its array"},
        {npy("{'descr': '>f4', 'fortran_order': False, 'shape': (1, 3)}", 0), "its numbers are '>f4'"},
        {npy("{'descr': '<f2', 'fortran_order': False, 'shape': (1, 3)}", 0), "its numbers are '<f2'"},
        {npy("{'descr': '\x1b[2J', 'fortran_order': False, 'shape': (1, 3)}", 0), "its numbers are '?[2J'"},
        {npy("{'descr': [('x', '<f4')]}", 0), "structures"},
        {npy("{'fortran_order': True}", 0), "in Fortran order: arrays in C order are read"},
        {npy("{'fortran_order': 1}", 0), "should have False at byte 18, and has '1}'"},
        {npy("{'shape': (1, 3), 'shape': (1, 3)}", 12), "'shape' twice"},
        {npy("{'shape': (1, 3), 'descr': '<f4'}", 12), "no 'fortran_order'"},
        {npy("{'shape': (1, 3), 'extra': 1}", 12), "unknown key 'extra'"},
        {npy("{'shape' (1, 3)}", 12), "should have : at byte 9"},
        {npy("{'sha\\x70e': (1, 3)}", 12), "without '\\'"},
        {npy("{'shape", 0), "closing quote"},
        {npy("{'descr': '<f4' 'shape': (1, 3)}", 12), "should have } at byte 16"},
        {npy("{'descr': '<f4', 'fortran_order': False, 'shape': (1, 3), } x", 12), "nothing more"},
        {shaped("(3)", 12), "should have ,"},
        {shaped("(3,)", 12), "its shape is [3]"},
        {shaped("()", 0), "its shape is []"},
        {shaped("(1, 4)", 16), "its shape is [1, 4]"},
        {shaped("(1, 1, 1, 3)", 12), "its shape is [1, 1, 1, 3]"},
        {shaped("(1, 1, 1, 1, 1, 3)", 12), "its shape is [1, 1, 1, 1, 1, ...]"},
        {shaped("(-1, 3)", 12), "a number at byte 51"},
        {shaped("(01, 3)", 12), "a number"},
        {shaped("(1,, 3)", 12), "a number"},
        {shaped("(18446744073709551616, 3)", 0), "too large"},
        // products that wrap to the size of the data
        {shaped("(1537228672809129302, 3)", 8), "cut short"},
        {shaped("(4611686018427387904, 1, 3)", 0), "cut short"},
    };
    for (const Refused& row : rows) {
        write(row.bytes);
        EXPECT_THAT(failureOf([&] { NpyFile{path()}; }),
                    AllOf(HasSubstr("'" + path() + "' cannot be read: "), HasSubstr(row.why)));
    }
}

TEST_F(NpyFiles, RefusesWhatIsNoFile) {
    ASSERT_EQ(mkfifo(path("pipe").c_str(), 0600), 0);
    EXPECT_THAT(failureOf([&] { NpyFile{path("pipe")}; }), HasSubstr("no regular file"));
    EXPECT_THAT(failureOf([&] { NpyFile{folder.path()}; }), HasSubstr("no regular file"));
    EXPECT_THAT(failureOf([&] { NpyFile{path("none.npy")}; }), HasSubstr("none.npy' cannot be read: No such file"));
}

TEST_F(NpyFiles, AFileThatIsCutWhileItIsOpenIsAnError) {
    const NpyFile file(write(npy("{'descr': '<f4', 'fortran_order': False, 'shape': (2, 1, 3)}", 24)));
    std::filesystem::resize_file(path(), std::filesystem::file_size(path()) - 4);
    EXPECT_THAT(frameOf(file, 0), ElementsAre(0, 0, 0));
    EXPECT_THAT(failureOf([&] { frameOf(file, 1); }), HasSubstr("cut short since it was opened"));
    EXPECT_FALSE(storage::identityOf(path()) == file.identity());
    std::vector<double> two(6);
    EXPECT_THROW(file.read(2, 0, std::span(two).first(3)), std::out_of_range);
    EXPECT_THROW(file.read(0, 0, two), std::out_of_range);
    EXPECT_THROW(file.read(0, 2, {}), std::out_of_range);
}

TEST_F(NpyFiles, NobodySeesAPartOfAFile) {
    write("before");
    const float point[] = {1, 2, 3};
    {
        NpyWriter writer(path(), 1);
        writer.append(point);
        EXPECT_EQ(content("cache.npy"), "before");
        EXPECT_EQ(names().size(), 2U) << "written in the same folder";
        EXPECT_THROW(writer.append(std::span(point).first(2)), std::invalid_argument);
    }
    EXPECT_EQ(content("cache.npy"), "before");
    EXPECT_EQ(names().size(), 1U) << "nothing is left without finish()";
    NpyWriter writer(path(), 1);
    writer.append(point);
    writer.finish();
    EXPECT_THROW(writer.append(point), std::logic_error);
    EXPECT_THROW(writer.finish(), std::logic_error);
    EXPECT_EQ(NpyFile(path()).frameCount(), 1U);
}

TEST_F(NpyFiles, FailedWritingSaysWhyAndLeavesWhatWasThere) {
    write("before");
    std::string reason;
    {
        NpyWriter writer(path(), 10000);
        const std::vector<float> frame(30000);
        const FileSizeLimit limit(200000);
        writer.append(frame);
        reason = failureOf([&] { writer.append(frame); });
        EXPECT_THROW(writer.finish(), std::logic_error) << "not a file with the frames of before";
        EXPECT_EQ(writer.frameCount(), 1U);
    }
    EXPECT_EQ(reason, path() + " could not be written: File too large");
    EXPECT_THAT(failureOf([&] {
                    NpyWriter(path(), 1).append(std::vector<float>{0, 0, -INFINITY});
                }),
                HasSubstr("vertex 0 of its frame 0 has a coordinate that is no finite number"));
    EXPECT_EQ(content("cache.npy"), "before");
    EXPECT_EQ(names().size(), 1U);
    EXPECT_THAT(failureOf([&] { NpyWriter("/dev/fd/2", 1); }), HasSubstr("one after the other only"))
        << "its head comes last";
}

TEST_F(NpyFiles, SmallArraysComeBackAndAreChecked) {
    storage::writeIntegers(path(), std::vector<std::int32_t>{3, -1});
    EXPECT_THAT(storage::readIntegers(path()), ElementsAre(3, -1));
    EXPECT_THAT(failureOf([&] { storage::readFloatTable(path()); }),
                HasSubstr("'<i4' in the shape [2], where '<f4' in 2 dimensions"));
    storage::writeFloatTable(path(), {2, 3, {1, 2, 3, 4, 5, 0.1F}});
    const storage::FloatTable table = storage::readFloatTable(path());
    EXPECT_EQ(table.columns, 3U);
    EXPECT_THAT(table.values, ElementsAre(1, 2, 3, 4, 5, 0.1F));
    write(content("cache.npy") + "x");
    EXPECT_THAT(failureOf([&] { storage::readFloatTable(path()); }), HasSubstr("takes 24 bytes, and 25 follow"));
    EXPECT_THAT(failureOf([&] { storage::readFloatTable(path("none")); }), HasSubstr("does not exist"));
}

TEST(FirstNotFinite, IsFoundWhereverItIs) {
    for (const std::size_t size : {1U, 4096U, 4097U, 10000U}) {
        std::vector<float> values(size, -FLT_MAX);
        EXPECT_EQ(storage::firstNotFinite(values), std::nullopt);
        for (const std::size_t place : {std::size_t{0}, size / 2, size - 1})
            for (const float bad : {INFINITY, -INFINITY, NAN}) {
                values.back() = bad;
                values[place] = bad;
                EXPECT_EQ(storage::firstNotFinite(values), place);
                values.back() = values[place] = 1.0F;
            }
    }
    EXPECT_EQ(storage::firstNotFinite({}), std::nullopt);
}

TEST(NpySeeds, AreAcceptedOrRefusedAsTheirNamesSay) {
    EXPECT_GE(runSeedCorpus("fuzz_npy", fuzzNpy), 4);
}

} // namespace
