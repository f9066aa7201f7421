// SPDX-License-Identifier: Apache-2.0
#include "nw_model/PrincipalBasisFiles.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdlib>
#include <fstream>
#include <optional>
#include <stdexcept>
#include <utility>
#include <vector>

#include "json.h"
#include "nw_model/PrincipalShapes.h"
#include "readers.h"
#include "storage/FileError.h"
#include "storage/NpzFile.h"
#include "storage/fileSum.h"
#include "storage/finite.h"

namespace neuralWarp {
namespace {

namespace fs = std::filesystem;

struct Counts {
    std::uint64_t shapes = 0, vertices = 0;
    bool operator==(const Counts&) const = default;
};

/// The counts that stand before the shapes in a JSON of which `head` is the beginning, as a reader of the whole would
/// find them; none where they stand elsewhere. What comes before the key of the shapes is closed, and parsed as a text
/// of its own: were that key within a text, a list or another object, it would be none.
Counts countsOf(std::string_view head) {
    const std::size_t key = head.find("\"principalShapes\"");
    const std::size_t comma = head.substr(0, key).find_last_not_of(" \t\r\n");
    if (key == std::string_view::npos || comma == std::string_view::npos || head[comma] != ',')
        return {};
    try {
        const json::Document members =
            storage::parseJson(std::string(head.substr(0, comma)) + "}", storage::jsonRules::principalShapes);
        if (!members.IsObject())
            return {};
        return {json::readUint(members, "principalShapeCount", 0), json::readUint(members, "principalVertCount", 0)};
    } catch (const storage::JsonError&) {
        return {};
    }
}

std::string sumIn(const storage::NpzFile& archive) {
    constexpr std::size_t digits = 32;
    storage::NpzArray array = archive.array("json_xxh3_128");
    if (array.head().descr != "|S32" || !array.head().shape.empty())
        throw std::runtime_error("its json_xxh3_128 is no text of 32 digits");
    array.requireSize(digits);
    std::string text(digits, '\0');
    array.read(std::as_writable_bytes(std::span(text)));
    array.finish();
    return text;
}

/// Numbers of some shapes, as they lie in an archive: none of them read.
struct Numbers {
    storage::NpzArray array;
    Counts counts;
};

/// `kinds` the descr that it may have, in quotation marks.
Numbers numbersIn(const storage::NpzFile& archive, const std::string& name, const std::string& kinds) {
    storage::NpzArray array = archive.array(name);
    const storage::NpyArray& head = array.head();
    if (kinds.find("'" + head.descr + "'") == std::string::npos || head.shape.size() != 3 || head.shape.back() != 3)
        throw std::runtime_error("its " + name + " are '" + head.descr + "' " + storage::npyShapeText(head.shape) +
                                 ", where " + kinds + " [vertices, shapes, 3] are to be");
    array.requireSize(static_cast<std::size_t>(head.descr.back() - '0'));
    const Counts counts{head.shape[1], head.shape[0]};
    return {std::move(array), counts};
}

/// Shapes of whole numbers: first those of two bytes a number.
struct WholeNumbers {
    explicit WholeNumbers(const storage::NpzFile& archive)
        : large(numbersIn(archive, "shapes_int16", "'<i2'"))
        , small(numbersIn(archive, "shapes_int8", "'|i1'")) {
        if (large.counts.vertices != small.counts.vertices)
            throw std::runtime_error("its shapes_int16 have " + std::to_string(large.counts.vertices) +
                                     " vertices, and its shapes_int8 " + std::to_string(small.counts.vertices));
    }
    Counts counts() const { return {large.counts.shapes + small.counts.shapes, small.counts.vertices}; }

    Numbers large, small;
};

std::vector<float> scalesIn(const storage::NpzFile& archive, std::uint64_t shapeCount) {
    storage::NpzArray array = archive.array("scales");
    if (array.head().descr != "<f4" || array.head().shape != std::vector<std::uint64_t>{shapeCount})
        throw std::runtime_error("its scales are '" + array.head().descr + "' " +
                                 storage::npyShapeText(array.head().shape) + ", and not one for each shape");
    array.requireSize(sizeof(float));
    std::vector<float> scales(shapeCount);
    array.read(std::as_writable_bytes(std::span(scales)));
    array.finish();
    constexpr float largestHalf = 65504;
    for (const float scale : scales)
        if (!std::isfinite(scale * largestHalf))
            throw std::runtime_error("it has a scale that is not finite, or too large: " + std::to_string(scale));
    return scales;
}

std::optional<std::size_t> firstNotFinite(std::span<const float> values) {
    return storage::firstNotFinite(values);
}

std::optional<std::size_t> firstNotFinite(std::span<const std::uint16_t> halves) {
    constexpr unsigned exponent = 0x7C00;
    const auto bad =
        std::find_if(halves.begin(), halves.end(), [](std::uint16_t half) { return (half & exponent) == exponent; });
    return bad == halves.end() ? std::nullopt : std::optional<std::size_t>(bad - halves.begin());
}

/// Passes on what `next` fills a block of whole vertices with.
///   counts  those of the numbers, of which there are as many as the file says that holds them; no shape, no block
template <class Number, class Next>
void passOn(PrincipalShapesSink& sink, const Counts& counts, Next next) {
    constexpr std::size_t blockBytes = 1U << 18U; // stays in the second cache until it is passed on
    const std::size_t perVertex = 3 * static_cast<std::size_t>(counts.shapes);
    const std::size_t perBlock = std::max<std::size_t>(blockBytes / sizeof(Number) / perVertex, 1);
    std::vector<Number> block(perVertex * std::min<std::uint64_t>(perBlock, counts.vertices));
    for (std::uint64_t vertex = 0; vertex < counts.vertices; vertex += perBlock) {
        const auto values =
            std::span(block).first(perVertex * std::min<std::uint64_t>(perBlock, counts.vertices - vertex));
        next(values);
        if (const auto bad = firstNotFinite(std::span<const Number>(values)))
            throw std::runtime_error("its shapes have a number that is not finite, of vertex " +
                                     std::to_string(vertex + *bad / perVertex));
        sink.append(std::span<const Number>(values));
    }
}

template <class Number>
void passOn(PrincipalShapesSink& sink, Numbers& numbers) {
    passOn<Number>(sink, numbers.counts,
                   [&](std::span<Number> values) { numbers.array.read(std::as_writable_bytes(values)); });
    numbers.array.finish();
}

/// The half (IEEE 754 binary16) that a whole number is. Throws when it is none.
std::uint16_t halfOf(int number) {
    constexpr unsigned fractionBits = 10, bias = 15;
    const unsigned magnitude = static_cast<unsigned>(std::abs(number)), sign = number < 0 ? 0x8000U : 0U;
    if (magnitude == 0)
        return 0;
    const unsigned exponent = static_cast<unsigned>(std::bit_width(magnitude)) - 1U;
    const unsigned fraction = magnitude << fractionBits >> exponent; // with the leading bit
    if (fraction << exponent >> fractionBits != magnitude)
        throw std::runtime_error("its shapes_int16 have a " + std::to_string(number) +
                                 ", which has more than eleven significant bits");
    return static_cast<std::uint16_t>(sign | (((exponent + bias - 1U) << fractionBits) + fraction));
}

/// Reads numbers of vertices [n][shapes][3] and puts them as halves into `out` [n][stride], from `start` of each on.
template <class Whole>
void readHalves(Numbers& numbers, std::vector<Whole>& block, std::span<std::uint16_t> out, std::size_t start,
                std::size_t stride) {
    const std::size_t perVertex = 3 * static_cast<std::size_t>(numbers.counts.shapes);
    block.resize(out.size() / stride * perVertex);
    numbers.array.read(std::as_writable_bytes(std::span(block)));
    const Whole* next = block.data();
    for (std::size_t vertex = start; vertex < out.size(); vertex += stride)
        for (std::size_t i = 0; i < perVertex; ++i)
            out[vertex + i] = halfOf(*next++);
}

void passOn(PrincipalShapesSink& sink, WholeNumbers& numbers) {
    const std::size_t inLarge = 3 * static_cast<std::size_t>(numbers.large.counts.shapes);
    const std::size_t perVertex = inLarge + 3 * static_cast<std::size_t>(numbers.small.counts.shapes);
    std::vector<std::int16_t> large;
    std::vector<std::int8_t> small;
    passOn<std::uint16_t>(sink, numbers.counts(), [&](std::span<std::uint16_t> halves) {
        readHalves(numbers.large, large, halves, 0, perVertex);
        readHalves(numbers.small, small, halves, inLarge, perVertex);
    });
    numbers.large.array.finish();
    numbers.small.array.finish();
}

/// Throws unless the JSON beside the archive is that of its sum, and begins with its counts.
void requireJson(const fs::path& path, const std::string& sum, const Counts& counts) {
    constexpr std::size_t headSize = 4096;
    const storage::FileSum found = storage::sumOfFile(path, principalShapesFileLimit, headSize);
    if (found.digits != sum)
        throw std::runtime_error("it was made of another principal_shapes.json than the one that is there");
    const Counts told = countsOf(found.head);
    if (told.shapes == 0 || told.vertices == 0)
        throw std::runtime_error("principal_shapes.json does not begin with principalShapeCount and "
                                 "principalVertCount, by which it would be checked");
    if (counts == told && 6 * counts.shapes * counts.vertices > fs::file_size(path)) // "0," and the like
        throw std::runtime_error("principal_shapes.json is too short for so many numbers");
    if (counts != told)
        throw std::runtime_error("it has " + std::to_string(counts.shapes) + " shapes of " +
                                 std::to_string(counts.vertices) + " vertices, and principal_shapes.json begins with " +
                                 std::to_string(told.shapes) + " of " + std::to_string(told.vertices));
}

/// Throws, with the reason, when the archive is of no use.
Counts readArchive(const fs::path& archivePath, const fs::path& jsonPath, PrincipalShapesSink& sink) {
    const storage::NpzFile archive(archivePath);
    const std::string sum = sumIn(archive);
    if (!archive.contains("shapes") && archive.contains("shapes_int8")) {
        WholeNumbers numbers(archive);
        const Counts counts = numbers.counts();
        requireJson(jsonPath, sum, counts);
        sink.begin(counts.shapes, counts.vertices, scalesIn(archive, counts.shapes));
        passOn(sink, numbers);
        return counts;
    }
    Numbers numbers = numbersIn(archive, "shapes", "'<f4' or '<f2'");
    const Counts counts = numbers.counts;
    const bool hasHalves = numbers.array.head().descr == "<f2";
    requireJson(jsonPath, sum, counts);
    sink.begin(counts.shapes, counts.vertices, hasHalves ? scalesIn(archive, counts.shapes) : std::vector<float>());
    if (hasHalves)
        passOn<std::uint16_t>(sink, numbers);
    else
        passOn<float>(sink, numbers);
    return counts;
}

/// False when the archive is not there, or of no use.
bool isReadFromArchive(const fs::path& directory, PrincipalShapesSink& sink, PrincipalShapesAnswer& answer) {
    const fs::path archive = directory / "principal_shapes.npz";
    std::error_code error;
    if (fs::status(archive, error).type() == fs::file_type::not_found)
        return false;
    try {
        const Counts counts = readArchive(archive, directory / "principal_shapes.json", sink);
        answer.shapeCount = counts.shapes;
        answer.vertCount = counts.vertices;
        answer.isFromArchive = true;
    } catch (const storage::FileError& failure) {
        answer.whyNotArchive = failure.what();
    } catch (const std::bad_alloc&) {
        answer.whyNotArchive = "there is no memory for it";
    } catch (const std::exception& failure) {
        answer.whyNotArchive = failure.what();
    }
    return answer.isFromArchive;
}

} // namespace

bool readPrincipalBasis(const fs::path& directory, PrincipalShapesSink& sink, PrincipalShapesAnswer& answer) noexcept {
    answer = {};
    try {
        if (isReadFromArchive(directory, sink, answer))
            return true;
        PrincipalShapes shapes;
        const fs::path path = directory / "principal_shapes.json";
        std::filebuf file;
        const bool isRead =
            json::open(file, path, storage::jsonRules::principalShapes) && readPrincipalShapes(shapes, file, path);
        answer.shapeCount = shapes.shapeCount;
        answer.vertCount = shapes.vertCount;
        if (!shapes.values.empty()) {
            sink.begin(shapes.shapeCount, shapes.vertCount, {});
            sink.append(std::span<const float>(shapes.values));
        }
        return isRead;
    } catch (...) {
        answer.shapeCount = 0;
        return json::refuseByException(directory / "principal_shapes.json");
    }
}

} // namespace neuralWarp
