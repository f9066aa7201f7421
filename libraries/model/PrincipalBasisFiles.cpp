// SPDX-License-Identifier: Apache-2.0
#include "nw_model/PrincipalBasisFiles.h"

#include <algorithm>
#include <cmath>
#include <fstream>
#include <optional>
#include <stdexcept>
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

/// How the numbers of an archive lie in it.
struct Layout {
    Counts counts;
    bool hasHalves = false;
};

Layout layoutOf(const storage::NpzArray& shapes) {
    const storage::NpyArray& head = shapes.head();
    const bool hasHalves = head.descr == "<f2";
    if ((head.descr != "<f4" && !hasHalves) || head.shape.size() != 3 || head.shape.back() != 3)
        throw std::runtime_error("its shapes are '" + head.descr + "' " + storage::npyShapeText(head.shape) +
                                 ", where '<f4' or '<f2' [vertices, shapes, 3] are to be");
    shapes.requireSize(hasHalves ? sizeof(std::uint16_t) : sizeof(float));
    return {{head.shape[1], head.shape[0]}, hasHalves};
}

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

/// `counts` those of the array, whose size is that of the file.
template <class Number>
void passOn(PrincipalShapesSink& sink, storage::NpzArray& shapes, const Counts& counts) {
    constexpr std::size_t blockBytes = 1U << 18U; // stays in the second cache until it is passed on
    const std::size_t perVertex = 3 * static_cast<std::size_t>(counts.shapes);
    const std::size_t perBlock = std::max<std::size_t>(blockBytes / sizeof(Number) / perVertex, 1);
    std::vector<Number> block(perVertex * std::min<std::uint64_t>(perBlock, counts.vertices));
    for (std::uint64_t vertex = 0; vertex < counts.vertices; vertex += perBlock) {
        const auto values =
            std::span(block).first(perVertex * std::min<std::uint64_t>(perBlock, counts.vertices - vertex));
        shapes.read(std::as_writable_bytes(values));
        if (const auto bad = firstNotFinite(values))
            throw std::runtime_error("its shapes have a number that is not finite, of vertex " +
                                     std::to_string(vertex + *bad / perVertex));
        sink.append(std::span<const Number>(values));
    }
    shapes.finish();
}

/// Throws, with the reason, when the archive is of no use.
Counts readArchive(const fs::path& archivePath, const fs::path& jsonPath, PrincipalShapesSink& sink) {
    constexpr std::size_t headSize = 4096;
    const storage::NpzFile archive(archivePath);
    const std::string wanted = sumIn(archive);
    storage::NpzArray shapes = archive.array("shapes");
    const auto [counts, hasHalves] = layoutOf(shapes);
    const storage::FileSum found = storage::sumOfFile(jsonPath, principalShapesFileLimit, headSize);
    if (found.digits != wanted)
        throw std::runtime_error("it was made of another principal_shapes.json than the one that is there");
    const Counts told = countsOf(found.head);
    if (told.shapes == 0 || told.vertices == 0)
        throw std::runtime_error("principal_shapes.json does not begin with principalShapeCount and "
                                 "principalVertCount, by which it would be checked");
    if (counts != told)
        throw std::runtime_error("it has " + std::to_string(counts.shapes) + " shapes of " +
                                 std::to_string(counts.vertices) + " vertices, and principal_shapes.json begins with " +
                                 std::to_string(told.shapes) + " of " + std::to_string(told.vertices));
    const std::vector<float> scales = hasHalves ? scalesIn(archive, counts.shapes) : std::vector<float>();
    sink.begin(counts.shapes, counts.vertices, scales);
    if (hasHalves)
        passOn<std::uint16_t>(sink, shapes, counts);
    else
        passOn<float>(sink, shapes, counts);
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
