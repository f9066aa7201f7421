// SPDX-License-Identifier: Apache-2.0
// Source of the format: the description of OBJ files, version 3.0, "Vertex data".
#include "storage/CacheLayout.h"
#include "storage/FileError.h"
#include "storage/FileIdentity.h"
#include "storage/framePattern.h"
#include "storage/readWholeFile.h"
#include "storage/unpack.h"

#include <algorithm>
#include <charconv>
#include <numeric>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace storage {
namespace {

constexpr std::uint64_t largestText = 1'000'000'000; // of a file
constexpr std::string_view blanks = " \t\r";

/// The number at the begin of what is left of a line, which is taken from it.
std::optional<double> takeNumber(std::string_view& rest) {
    rest.remove_prefix(std::min(rest.find_first_not_of(blanks), rest.size()));
    if (rest.starts_with('+'))
        rest.remove_prefix(1);
    double value = 0.0;
    const auto [end, error] = std::from_chars(rest.data(), rest.data() + rest.size(), value);
    if (error != std::errc())
        return std::nullopt;
    rest.remove_prefix(static_cast<std::size_t>(end - rest.data()));
    if (!rest.empty() && blanks.find(rest.front()) == std::string_view::npos)
        return std::nullopt;
    return value;
}

/// What follows "v" in a line of that kind.
std::optional<std::string_view> vertexLine(std::string_view line) {
    line.remove_prefix(std::min(line.find_first_not_of(blanks), line.size()));
    if (line.size() < 2 || line[0] != 'v' || blanks.find(line[1]) == std::string_view::npos)
        return std::nullopt;
    return line.substr(1);
}

/// x, y, z of the vertices of a text.
std::vector<float> positionsIn(std::string_view text) {
    std::vector<float> xyz;
    for (std::size_t number = 1; !text.empty(); ++number) {
        const std::string_view line = text.substr(0, text.find('\n'));
        text.remove_prefix(std::min(line.size() + 1, text.size()));
        std::optional<std::string_view> rest = vertexLine(line);
        for (int axis = 0; rest && axis < 3; ++axis) {
            const std::optional<double> value = takeNumber(*rest);
            if (!value)
                throw std::runtime_error("its line " + std::to_string(number) + " is no vertex: \"" +
                                         std::string(line.substr(0, 80)) + "\"");
            xyz.push_back(static_cast<float>(*value));
        }
    }
    if (xyz.empty())
        throw std::runtime_error("it has no vertices");
    return xyz;
}

std::string rangeText(std::int64_t first, std::int64_t last) {
    return std::to_string(first) + (first == last ? "" : "-" + std::to_string(last));
}

/// The steps from a frame to the next, which must all be the same: names the frames that are missing otherwise.
std::int64_t stepOf(const std::vector<int>& frames) {
    std::int64_t step = 0;
    for (std::size_t i = 1; i < frames.size(); ++i)
        step = std::gcd(step, std::int64_t{frames[i]} - frames[i - 1]);
    std::string missing;
    for (std::size_t i = 1, gaps = 0; i < frames.size(); ++i)
        if (frames[i] - std::int64_t{frames[i - 1]} != step && ++gaps <= 5)
            missing +=
                (gaps == 1 ? "" : ", ") + (gaps == 5 ? "..." : rangeText(frames[i - 1] + step, frames[i] - step));
    if (!missing.empty())
        throw std::runtime_error("of its frames " + rangeText(frames.front(), frames.back()) +
                                 " there are no files of " + missing);
    return std::max<std::int64_t>(step, 1);
}

class Reading {
public:
    Reading() { layout_.unpacked = unnamedFile(); }

    void add(const std::filesystem::path& file, std::size_t frames) {
        const std::vector<float> xyz = positionsOf(file);
        if (layout_.frames == 0)
            begin(xyz.size() / 3, frames);
        if (xyz.size() / 3 != layout_.vertices)
            throw std::runtime_error(file.filename().string() + " has " + std::to_string(xyz.size() / 3) +
                                     " vertices, and the first file has " + std::to_string(layout_.vertices));
        if (const int error = writeAll(layout_.unpacked.number(), std::as_bytes(std::span(xyz))))
            throw std::runtime_error("it cannot be unpacked: " + textOfErrno(error));
        ++layout_.frames;
    }
    CacheLayout finish() {
        const FileBytes all{layout_.unpacked.number(), 0, layout_.frames * layout_.vertices * 3 * sizeof(float)};
        layout_.points = pointsOf(layout_, all, 0);
        return std::move(layout_);
    }

private:
    static std::vector<float> positionsOf(const std::filesystem::path& file) {
        const std::string text = readWholeFile(file, largestText);
        try {
            return positionsIn(text);
        } catch (const std::runtime_error& error) {
            throw std::runtime_error(file.filename().string() + ": " + error.what());
        }
    }
    void begin(std::size_t vertices, std::size_t frames) {
        layout_.vertices = vertices;
        if (vertices * 3 * sizeof(float) > unpackedLimit / frames)
            throw std::runtime_error(std::to_string(frames) + " frames of " + std::to_string(vertices) +
                                     " vertices are more than 4 GB: make a cache of one file");
    }

    CacheLayout layout_;
};

} // namespace

CacheLayout objLayout(const std::filesystem::path& path) {
    Reading reading;
    if (!isFramePattern(path) || identityOf(path.string())) { // a file may have a "#" in its name
        reading.add(path, 1);
        return reading.finish();
    }
    const std::vector<int> frames = framesOf(path);
    if (frames.empty())
        throw std::runtime_error("there is no file of such a name with a number in place of #, as " +
                                 frameFile(path, 1).filename().string());
    const std::int64_t step = stepOf(frames);
    for (const int frame : frames)
        reading.add(frameFile(path, frame), frames.size());
    CacheLayout layout = reading.finish();
    layout.firstFrame = static_cast<float>(frames.front());
    layout.frameStep = static_cast<float>(step);
    return layout;
}

} // namespace storage
