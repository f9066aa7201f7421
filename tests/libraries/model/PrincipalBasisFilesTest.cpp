// SPDX-License-Identifier: Apache-2.0
// Shapes are the same, to the bit, by the archive and by the text, whatever is wrong with the archive.
#include "nw_model/PrincipalBasisFiles.h"

#include <bit>
#include <cmath>
#include <new>
#include <random>
#include <sstream>

#include <gmock/gmock.h>

#include "storage/fileSum.h"
#include "support.h"
#include "support/npzBytes.h"

using namespace neuralWarp;
using testing::HasSubstr;

namespace {

/// The number that a finite half is, by its definition.
float numberOf(std::uint16_t half) {
    const int exponent = half >> 10U & 31;
    const double magnitude =
        exponent == 0 ? std::ldexp(half & 0x3FF, -24) : std::ldexp(1024 + (half & 0x3FF), exponent - 25);
    return static_cast<float>((half & 0x8000) != 0 ? -magnitude : magnitude);
}

/// Keeps what comes; `failures` beginnings fail.
class Collector final : public PrincipalShapesSink {
public:
    void begin(std::uint64_t shapeCount, std::uint64_t vertCount, std::span<const float> scalesOf) override {
        values.clear();
        scales.assign(scalesOf.begin(), scalesOf.end());
        size = 3 * shapeCount * vertCount;
        if (failures-- > 0)
            throw std::bad_alloc();
    }
    void append(std::span<const float> more) override { values.insert(values.end(), more.begin(), more.end()); }

    void append(std::span<const std::uint16_t> halves) override {
        for (const std::uint16_t half : halves) {
            const float scale = scales.at(values.size() / 3 % scales.size());
            values.push_back(scale * numberOf(half));
        }
    }

    int failures = 0;
    std::size_t size = 0;
    std::vector<float> values, scales;
};

struct Reading {
    bool ok = false;
    PrincipalShapesAnswer answer;
    std::vector<std::uint32_t> bits;
    std::string output;
};

Reading read(const std::filesystem::path& directory, int failures = 0) {
    Reading reading;
    Collector sink;
    sink.failures = failures;
    StdoutCapture out;
    reading.ok = readPrincipalBasis(directory, sink, reading.answer);
    reading.output = out.take();
    for (const float value : sink.values)
        reading.bits.push_back(std::bit_cast<std::uint32_t>(value));
    EXPECT_TRUE(!reading.ok || sink.values.size() == sink.size);
    return reading;
}

/// A model directory with shapes of all sizes of numbers.
struct Model {
    Model(std::uint64_t shapes, std::uint64_t vertices)
        : shapeCount(shapes)
        , vertCount(vertices)
        , values(3 * shapes * vertices) {
        std::mt19937 random(7);
        std::uniform_int_distribution<std::uint32_t> bits;
        for (float& value : values)
            do {
                value = std::bit_cast<float>(bits(random));
            } while (!std::isfinite(value) || std::bit_cast<std::uint32_t>(value) == 0x80000000); // "-0" is read as 0
        writeText();
        folder.write("principal_shapes.npz", archive());
    }

    void writeText(const std::string& before = "", const std::string& behind = "") const {
        std::ostringstream text;
        text.precision(9);
        text << before << "{\"principalShapeCount\": " << shapeCount << ", \"principalVertCount\": " << vertCount
             << ", \"principalShapes\": [";
        for (std::size_t s = 0; s < shapeCount; ++s) {
            text << (s == 0 ? "[" : ",\n[");
            for (std::size_t i = 0; i < 3 * vertCount; ++i)
                text << (i == 0 ? "" : ",") << values[3 * (i / 3 * shapeCount + s) + i % 3];
            text << "]";
        }
        text << "]}" << behind;
        folder.write("principal_shapes.json", text.str());
    }
    std::string digits() const { return storage::sumOfFile(folder / "principal_shapes.json", UINT64_MAX, 0).digits; }
    std::string archive() const { return shapesArchive(digits(), values, shapeCount); }
    std::vector<std::uint32_t> bits() const {
        std::vector<std::uint32_t> bits;
        for (const float value : values)
            bits.push_back(std::bit_cast<std::uint32_t>(value));
        return bits;
    }

    TestFolder folder;
    std::uint64_t shapeCount, vertCount;
    std::vector<float> values;
};

/// "principal_shapes.npz" of halves.
std::string halvesArchive(const std::string& digits, const std::string& numbers, const std::string& scales,
                          std::uint64_t shapes, std::uint64_t vertices) {
    return npzBytes({{"json_xxh3_128", npyBytes("|S32", {}, digits)},
                     {"shapes", npyBytes("<f2", {vertices, shapes, 3}, numbers)},
                     {"scales", npyBytes("<f4", {scales.size() / sizeof(float)}, scales)}});
}

template <class Number>
std::string bytesOf(const std::vector<Number>& numbers) {
    return {reinterpret_cast<const char*>(numbers.data()), numbers.size() * sizeof(Number)};
}

/// However an archive is damaged.
void expectSameBits(const Model& model, const std::string& sound) {
    std::size_t refused = 0;
    for (std::size_t place = 0; place < 2 * sound.size(); place += place < sound.size() ? 5U : 1U) {
        std::string bytes = sound.substr(0, place); // first all that is cut short, then a changed byte
        if (place >= sound.size())
            (bytes = sound)[place - sound.size()] ^= 0x11;
        model.folder.write("principal_shapes.npz", bytes);
        const Reading reading = read(model.folder.path());
        ASSERT_TRUE(reading.ok && reading.bits == model.bits()) << "at " << place;
        ASSERT_EQ(reading.answer.isFromArchive, reading.answer.whyNotArchive.empty()) << "at " << place;
        refused += reading.answer.isFromArchive ? 0 : 1;
    }
    EXPECT_GT(refused, sound.size() / 2) << "all but what an archive says twice, or of its time";
}

} // namespace

TEST(PrincipalBasisFiles, BothWaysGiveTheSameBits) {
    const std::pair<std::uint64_t, std::uint64_t> sizes[] = {
        {1, 1}, {3, 40}, {7, 6500}, {23000, 2}}; // blocks and rests
    for (const auto& [shapes, vertices] : sizes) {
        SCOPED_TRACE(testing::Message() << shapes << " shapes of " << vertices);
        const Model model(shapes, vertices);
        const Reading quick = read(model.folder.path());
        std::filesystem::remove(model.folder / "principal_shapes.npz");
        const Reading slow = read(model.folder.path());
        for (const Reading& reading : {quick, slow}) {
            EXPECT_TRUE(reading.ok);
            EXPECT_EQ(reading.answer.whyNotArchive + reading.output, "");
            EXPECT_EQ(reading.answer.shapeCount, shapes);
            EXPECT_EQ(reading.answer.vertCount, vertices);
            EXPECT_TRUE(reading.bits == model.bits());
        }
        EXPECT_TRUE(quick.answer.isFromArchive);
        EXPECT_FALSE(slow.answer.isFromArchive);
    }
}

TEST(PrincipalBasisFiles, HalvesAreTheNumbersOfTheText) {
    Model model(7, 6500);
    std::mt19937 random(3);
    const std::vector<float> scales{1, 0.125F, 3e30F, 1e-30F, 0.3F, 65536, 7};
    std::vector<std::uint16_t> halves;
    for (std::size_t i = 0; i < model.values.size(); ++i) {
        halves.push_back(static_cast<std::uint16_t>(random() % 0x7C00 + (i % 2 == 0 ? 0x8000 : 0)));
        if (halves.back() == 0x8000)
            halves.back() = 0; // "-0" is read as 0
        model.values[i] = scales[i / 3 % 7] * numberOf(halves.back());
    }
    model.writeText();
    const auto reading = [&](const std::vector<std::uint16_t>& numbers, const std::vector<float>& by) {
        model.folder.write("principal_shapes.npz",
                           halvesArchive(model.digits(), bytesOf(numbers), bytesOf(by), 7, 6500));
        Reading answer = read(model.folder.path());
        EXPECT_TRUE(answer.ok && answer.bits == model.bits());
        return answer.answer;
    };
    EXPECT_TRUE(reading(halves, scales).isFromArchive);
    EXPECT_THAT(reading(halves, {1, 2, 3}).whyNotArchive,
                HasSubstr("scales are '<f4' [3], and not one for each shape"));
    EXPECT_THAT(reading(halves, {1, 2, 3, 4, 5, 6, 1e35F}).whyNotArchive, HasSubstr("not finite, or too large"));
    halves[3 * 7 * 6000 + 5] = 0xFC00;
    EXPECT_THAT(reading(halves, scales).whyNotArchive, HasSubstr("not finite, of vertex 6000"));
}

TEST(PrincipalBasisFiles, WholeNumbersAreTheNumbersOfTheText) {
    Model model(7, 6500);
    std::mt19937 random(3);
    const std::vector<float> scales{1, 0.125F, 3e30F, 1e-30F, 0.3F, 65536, 7};
    for (const std::uint64_t largeCount : {0U, 3U, 7U}) {
        std::vector<std::int16_t> large;
        std::string small;
        for (std::size_t i = 0; i < model.values.size(); ++i) {
            int number = static_cast<int>(random() % 256) - 128;
            if (i / 3 % 7 < largeCount) {
                number = (static_cast<int>(random() % 4097) - 2048) * (1 << random() % 4);
                large.push_back(static_cast<std::int16_t>(number));
            } else {
                small.push_back(static_cast<char>(number));
            }
            model.values[i] = scales[i / 3 % 7] * static_cast<float>(number);
        }
        model.writeText();
        for (const bool isDeflated : {false, true}) {
            SCOPED_TRACE(testing::Message() << largeCount << " large ones, deflated: " << isDeflated);
            model.folder.write("principal_shapes.npz",
                               npzBytes({{"json_xxh3_128", npyBytes("|S32", {}, model.digits())},
                                         {"shapes_int16", npyBytes("<i2", {6500, largeCount, 3}, bytesOf(large))},
                                         {"shapes_int8", npyBytes("|i1", {6500, 7 - largeCount, 3}, small)},
                                         {"scales", npyBytes("<f4", {7}, bytesOf(scales))}},
                                        isDeflated));
            const Reading reading = read(model.folder.path());
            EXPECT_EQ(reading.answer.whyNotArchive, "");
            EXPECT_TRUE(reading.answer.isFromArchive && reading.bits == model.bits());
        }
    }
}

/// A few bytes of an archive can be a thousand times as many numbers, a text cannot.
TEST(PrincipalBasisFiles, AnArchiveHasNoMoreNumbersThanTheTextHasRoomFor) {
    const TestFolder folder;
    const auto json = folder.write("principal_shapes.json",
                                   R"({"principalShapeCount": 9, "principalVertCount": 999, "principalShapes": []})");
    folder.write("principal_shapes.npz",
                 npzBytes({{"json_xxh3_128", npyBytes("|S32", {}, storage::sumOfFile(json, UINT64_MAX, 0).digits)},
                           {"shapes", npyBytes("<f4", {999, 9, 3}, std::string(std::size_t{999} * 9 * 12, '\0'))}},
                          true));
    const Reading reading = read(folder.path());
    EXPECT_FALSE(reading.ok);
    EXPECT_THAT(reading.answer.whyNotArchive, HasSubstr("principal_shapes.json is too short for so many numbers"));
}

TEST(PrincipalBasisFiles, NoDamageOfTheArchiveChangesABit) {
    Model model(2, 1);
    model.values = {1, 2, 3, -4, 5, 6};
    model.writeText();
    const std::string floats = model.archive();
    const std::string wholes = npzBytes({{"json_xxh3_128", npyBytes("|S32", {}, model.digits())},
                                         {"shapes_int16", npyBytes("<i2", {1, 1, 3}, {"\1\0\2\0\3\0", 6})},
                                         {"shapes_int8", npyBytes("|i1", {1, 1, 3}, "\xFC\5\6")},
                                         {"scales", npyBytes("<f4", {2}, bytesOf(std::vector<float>{1, 1}))}},
                                        true);
    for (const std::string& sound : {floats, wholes})
        expectSameBits(model, sound);
}

TEST(PrincipalBasisFiles, WhatIsWrongWithTheArchiveIsSaid) {
    const Model model(3, 4);
    const std::string digits = model.digits(), numbers = bytesOf(model.values);
    const auto with = [&](const std::string& sum, const std::string& shapes) {
        return npzBytes({{"json_xxh3_128", sum}, {"shapes", shapes}});
    };
    const auto text = [](const std::string& sum) { return npyBytes("|S32", {}, sum); };
    const auto shapes = [&](const std::vector<std::uint64_t>& shape) { return npyBytes("<f4", shape, numbers); };
    std::vector<float> infinite = model.values;
    infinite[20] = -HUGE_VALF;
    const auto wholes = [&](const std::vector<std::uint64_t>& largeShape, const std::vector<std::uint64_t>& smallShape,
                            std::int16_t first = 1) {
        std::vector<std::int16_t> large(largeShape[0] * largeShape[1] * 3);
        if (!large.empty())
            large.back() = first;
        return npzBytes(
            {{"json_xxh3_128", text(digits)},
             {"shapes_int16", npyBytes("<i2", largeShape, bytesOf(large))},
             {"shapes_int8", npyBytes("|i1", smallShape, std::string(smallShape[0] * smallShape[1] * 3, 1))},
             {"scales", npyBytes("<f4", {3}, bytesOf(std::vector<float>(3, 1)))}});
    };
    std::string fortran = shapes({4, 3, 3});
    fortran.replace(fortran.find("False"), 5, "True ");
    std::string compressed = model.archive();
    compressed[compressed.rfind("PK\1\2") + 10] = 8; // shapes: the method in the directory
    std::string endless = compressed;
    for (unsigned i = 0; i < 4; ++i)
        endless[endless.rfind("PK\1\2") + 24 + i] = static_cast<char>(1000000 >> 8 * i);
    const std::pair<std::string, std::string> rows[] = {
        {"", "it is no archive of NumPy, or cut short"},
        {"PK no", "it is no archive of NumPy, or cut short"},
        {npzBytes({{"shapes", shapes({4, 3, 3})}}), "it has no array 'json_xxh3_128'"},
        {npzBytes({{"json_xxh3_128", text(digits)}}), "it has no array 'shapes'"},
        {npzBytes({{"json_xxh3_128", text(digits)}, {"shapes", shapes({4, 3, 3})}, {"shapes", shapes({4, 3, 3})}}),
         "2 members shapes.npy"},
        {compressed, "its array cannot be unpacked"},
        {endless, "bytes are to unpack to 1000000"},
        {npzBytes({{"json_xxh3_128", text(digits)}, {"shapes_int8", npyBytes("|i1", {4, 3, 3}, numbers.substr(108))}}),
         "it has no array 'shapes_int16'"},
        {npzBytes({{"json_xxh3_128", text(digits)}, {"shapes_int16", npyBytes("<i2", {4, 3, 3}, numbers.substr(72))}}),
         "it has no array 'shapes'"},
        {wholes({4, 1, 3}, {3, 2, 3}), "its shapes_int16 have 4 vertices, and its shapes_int8 3"},
        {wholes({4, 1, 3}, {4, 1, 3}), "2 shapes of 4 vertices, and principal_shapes.json begins with 3 of 4"},
        {wholes({4, 1, 3}, {4, 2, 3}, 4097), "shapes_int16 have a 4097, which has more than eleven significant bits"},
        {with(npyBytes("|S31", {}, digits.substr(1)), shapes({4, 3, 3})), "json_xxh3_128 is no text of 32 digits"},
        {with(npyBytes("|S32", {2}, digits + digits), shapes({4, 3, 3})), "json_xxh3_128 is no text of 32 digits"},
        {with(text("0" + digits.substr(1)), shapes({4, 3, 3})), "made of another principal_shapes.json"},
        {with(text(digits), npyBytes(">f4", {4, 3, 3}, numbers)), "its shapes are '>f4' [4, 3, 3]"},
        {with(text(digits), npyBytes("<f2", {4, 3, 3}, numbers)), "takes 72 bytes, and 144 follow"},
        {with(text(digits), npyBytes("<f2", {4, 3, 3}, numbers.substr(72))), "it has no array 'scales'"},
        {with(text(digits), npyBytes("<f8", {4, 3, 3}, numbers + numbers)), "its shapes are '<f8'"},
        {with(text(digits), shapes({12, 3})), "[12, 3], where '<f4' or '<f2' [vertices, shapes, 3]"},
        {with(text(digits), shapes({3, 3, 4})), "[3, 3, 4], where"},
        {with(text(digits), fortran), "Fortran order"},
        {with(text(digits), shapes({3, 4, 3})), "4 shapes of 3 vertices, and principal_shapes.json begins with 3 of 4"},
        {with(text(digits), shapes({1U << 31U, 1U << 31U, 3})), "is too large"},
        {with(text(digits), shapes({4, 4, 3})), "takes 192 bytes, and 144 follow"},
        {with(text(digits), npyBytes("<f4", {0, 3, 3}, "")), "3 shapes of 0 vertices"},
        {shapesArchive(digits, infinite, 3), "not finite, of vertex 2"},
    };
    for (const auto& [archive, reason] : rows) {
        SCOPED_TRACE(reason);
        model.folder.write("principal_shapes.npz", archive);
        const Reading reading = read(model.folder.path());
        EXPECT_TRUE(reading.ok && reading.bits == model.bits());
        EXPECT_THAT(reading.answer.whyNotArchive, HasSubstr(reason));
        EXPECT_EQ(reading.output, "");
    }
    std::filesystem::remove(model.folder / "principal_shapes.npz");
    std::filesystem::create_directory(model.folder / "principal_shapes.npz");
    EXPECT_THAT(read(model.folder.path()).answer.whyNotArchive, HasSubstr("is no regular file"));
}

TEST(PrincipalBasisFiles, TheTextHasItsCountsBeforeItsShapes) {
    struct Row {
        const char *text, *reason;
    };
    // the archive says one shape of one vertex
    const Row rows[] = {
        {R"({"principalShapeCount": 1, "a": {"principalShapes": []}, "principalVertCount": 1, "principalShapes": [[1, 2, 3]]})",
         "does not begin with"},
        {R"({"note": "{\"principalShapeCount\": 9, \"principalShapes\"", "principalShapeCount": 1, "vertCount": 1,
            "principalShapes": [[1, 2, 3]]})",
         "does not begin with"},
        {R"({"principalShapes": [[1, 2, 3]], "principalShapeCount": 1, "principalVertCount": 1})", "does not begin"},
        {R"({"principalShapeCount": 1, "vertCount": 1, "principalShapes": [[1, 2, 3]]})", "does not begin with"},
        {R"({"principalShapeCount": 1.0, "principalVertCount": 1, "principalShapes": [[1, 2, 3]]})", "does not begin"},
        {R"({"x": ["principalShapes"], "principalShapeCount": 1, "principalVertCount": 1, "principalShapes": [[1, 2, 3]]})",
         "does not begin with"},
        {R"({"principalShapeCount": 1, "x": 9, "principalVertCount": 1 , "principalShapes": [[1, 2, 3]]})", ""},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.text);
        const TestFolder folder;
        const auto json = folder.write("principal_shapes.json", row.text);
        folder.write("principal_shapes.npz",
                     shapesArchive(storage::sumOfFile(json, UINT64_MAX, 0).digits, {1, 2, 3}, 1));
        const Reading reading = read(folder.path());
        EXPECT_THAT(reading.answer.whyNotArchive, HasSubstr(row.reason));
        EXPECT_EQ(reading.answer.isFromArchive, *row.reason == '\0');
    }
}

TEST(PrincipalBasisFiles, ALackOfMemoryIsNoBasis) {
    const Model model(3, 4);
    const Reading once = read(model.folder.path(), 1); // the archive finds none, the text does
    EXPECT_TRUE(once.ok && once.bits == model.bits());
    EXPECT_EQ(once.answer.whyNotArchive, "there is no memory for it");
    const Reading twice = read(model.folder.path(), 2);
    EXPECT_FALSE(twice.ok);
    EXPECT_EQ(twice.answer.shapeCount, 0U);
    EXPECT_THAT(twice.output, HasSubstr("principal_shapes.json: out of memory\n"));
}

TEST(PrincipalBasisFiles, WithoutTheTextThereIsNoBasis) {
    const Model model(1, 1);
    std::filesystem::remove(model.folder / "principal_shapes.json");
    const Reading reading = read(model.folder.path());
    EXPECT_FALSE(reading.ok);
    EXPECT_EQ(reading.output, "Failed to open metadata file stream\n");
    EXPECT_THAT(reading.answer.whyNotArchive, HasSubstr("principal_shapes.json does not exist"));
}
