// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/sceneOrder.h"

#include "rig/NpyFile.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <fstream>
#include <iterator>
#include <limits>
#include <stdexcept>

namespace quarn {
namespace {

constexpr std::uintmax_t largestMap = std::uintmax_t{1} << 31U; // bytes

[[noreturn]] void fail(const std::filesystem::path& file, const std::string& why) {
    throw std::runtime_error(file.string() + " is no map of vertices: " + why);
}

std::string bytesOf(const std::filesystem::path& file) {
    std::error_code error;
    const std::uintmax_t size = std::filesystem::file_size(file, error);
    if (error)
        throw std::runtime_error(file.string() + " could not be read: " + error.message());
    if (size > largestMap)
        fail(file, "it has " + std::to_string(size) + " bytes");
    std::ifstream stream(file, std::ios::binary);
    std::string bytes(std::istreambuf_iterator<char>(stream), {});
    if (!stream || bytes.size() != size)
        throw std::runtime_error(file.string() + " could not be read");
    return bytes;
}

// the header without its blanks, up to the length of the only dimension
std::size_t lengthIn(const std::filesystem::path& file, std::string header) {
    std::replace(header.begin(), header.end(), '"', '\'');
    header.erase(std::remove_if(header.begin(), header.end(), [](char c) { return c == ' ' || c == '\n'; }),
                 header.end());
    constexpr std::string_view beforeLength = "'shape':(";
    const std::size_t place = header.find(beforeLength);
    if (header.find("'descr':'<i4'") == std::string::npos || place == std::string::npos)
        fail(file, "its numbers are not '<i4', 32-bit integers");
    const char* begin = header.data() + place + beforeLength.size();
    const char* end = header.data() + header.size();
    std::size_t length = 0;
    const auto [rest, error] = std::from_chars(begin, end, length);
    if (error != std::errc() || !std::string_view(rest, static_cast<std::size_t>(end - rest)).starts_with(",)"))
        fail(file, "it does not have one dimension");
    return length;
}

double distanceTo(std::span<const float> point, std::span<const double> other) {
    double sum = 0.0;
    for (std::size_t axis = 0; axis < 3; ++axis)
        sum += (other[axis] - point[axis]) * (other[axis] - point[axis]);
    return std::sqrt(sum);
}

// one frame from the file's order into the scene's
class Joiner {
public:
    Joiner(const std::vector<std::int32_t>& map, std::size_t sceneVertices)
        : map_(map)
        , filePoints_(3 * map.size())
        , scenePoints_(3 * sceneVertices)
        , first_(sceneVertices, map.size()) {
        for (std::size_t vertex = map.size(); vertex-- > 0;)
            first_[static_cast<std::size_t>(map[vertex])] = vertex;
    }

    std::span<double> filePoints() { return filePoints_; }

    std::span<const float> join() {
        for (std::size_t vertex = 0; vertex < first_.size(); ++vertex)
            for (std::size_t axis = 0; axis < 3; ++axis)
                scenePoints_[3 * vertex + axis] = static_cast<float>(filePoints_[3 * first_[vertex] + axis]);
        for (std::size_t vertex = 0; vertex < map_.size(); ++vertex)
            measure(vertex, static_cast<std::size_t>(map_[vertex]));
        return scenePoints_;
    }
    double largestDistance() const { return largest_; }

private:
    void measure(std::size_t fileVertex, std::size_t sceneVertex) {
        if (first_[sceneVertex] == fileVertex)
            return;
        const double distance = distanceTo(std::span(scenePoints_).subspan(3 * sceneVertex, 3),
                                           std::span(filePoints_).subspan(3 * fileVertex, 3));
        largest_ = std::isnan(distance) ? std::numeric_limits<double>::infinity() : std::max(largest_, distance);
    }

    const std::vector<std::int32_t>& map_;
    std::vector<double> filePoints_;
    std::vector<float> scenePoints_;
    std::vector<std::size_t> first_; ///< of each vertex of the scene, the first in the file
    double largest_ = 0.0;
};

} // namespace

std::vector<std::int32_t> readVertexMap(const std::filesystem::path& file) {
    const std::string bytes = bytesOf(file);
    rig::NpyPlace place;
    try {
        place = rig::findNpyHeader(std::string_view(bytes).substr(0, rig::npyPreambleSize));
    } catch (const std::runtime_error& error) {
        fail(file, error.what());
    }
    const std::size_t start = place.start + place.length;
    if (start > bytes.size())
        fail(file, "it is cut short within its header");
    const std::size_t length = lengthIn(file, bytes.substr(place.start, place.length));
    const std::size_t rest = bytes.size() - start;
    if (rest % 4 != 0 || rest / 4 != length)
        fail(file, "it has " + std::to_string(rest) + " bytes for " + std::to_string(length) + " numbers of four");
    std::vector<std::int32_t> map(length);
    for (std::size_t i = 0; i < length; ++i) {
        std::uint32_t number = 0;
        for (unsigned byte = 0; byte < 4; ++byte)
            number |= std::uint32_t{static_cast<unsigned char>(bytes[start + 4 * i + byte])} << (8U * byte);
        map[i] = static_cast<std::int32_t>(number);
    }
    return map;
}

void requireFit(const std::vector<std::int32_t>& map, std::size_t fileVertices, std::size_t sceneVertices) {
    if (map.size() != fileVertices)
        throw std::runtime_error("the cache has " + std::to_string(fileVertices) +
                                 " vertices, and the character's file has " + std::to_string(map.size()));
    std::vector<bool> covered(sceneVertices, false);
    for (std::size_t vertex = 0; vertex < map.size(); ++vertex) {
        if (map[vertex] < 0 || static_cast<std::size_t>(map[vertex]) >= sceneVertices)
            throw std::runtime_error("the character's vertex map says that vertex " + std::to_string(vertex) +
                                     " of the file is vertex " + std::to_string(map[vertex]) +
                                     " of the scene's mesh, which has " + std::to_string(sceneVertices));
        covered[static_cast<std::size_t>(map[vertex])] = true;
    }
    const auto missing = std::find(covered.begin(), covered.end(), false);
    if (missing != covered.end())
        throw std::runtime_error("the character's vertex map has no vertex of the file for vertex " +
                                 std::to_string(missing - covered.begin()) + " of the scene's mesh, which has " +
                                 std::to_string(sceneVertices));
}

double writeInSceneOrder(const std::filesystem::path& from, const std::filesystem::path& to,
                         const std::vector<std::int32_t>& map, std::size_t sceneVertices, const Console& console) {
    const rig::NpyFile file(from.string());
    rig::NpyWriter writer(to.string(), sceneVertices);
    Joiner joiner(map, sceneVertices);
    Progress progress(console, "joining vertices", std::max<std::size_t>(1, file.frameCount()));
    for (std::size_t frame = 0; frame < file.frameCount(); ++frame) {
        file.read(frame, 0, joiner.filePoints());
        writer.append(joiner.join());
        progress.advance();
    }
    writer.finish();
    return joiner.largestDistance();
}

} // namespace quarn
