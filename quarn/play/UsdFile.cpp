// SPDX-License-Identifier: Apache-2.0
// Source: the text format of layers and the schema of meshes in the documentation of USD (usda, UsdGeomMesh,
// UsdGeomPointBased, UsdGeomBoundable).
#include "quarn/play/UsdFile.h"

#include <algorithm>
#include <charconv>
#include <ostream>

namespace quarn {
namespace {

constexpr std::uint64_t bytesPerPoint = 44; // "(-0.123456789, 1.23456789, 0.0123456789), ", with a margin
constexpr std::uint64_t bytesPerUv = 30;
constexpr std::uint64_t bytesPerIndex = 8;

// in so many digits, whatever the locale: nine for float and seventeen for double read back as the same number
void append(std::string& text, double value, int digits) {
    std::array<char, 32> room{};
    const auto end =
        std::to_chars(room.data(), room.data() + room.size(), value, std::chars_format::general, digits).ptr;
    text.append(room.data(), end);
}

std::string decimal(double value) {
    std::array<char, 32> room{};
    return {room.data(), std::to_chars(room.data(), room.data() + room.size(), value).ptr};
}

void appendPoints(std::string& text, std::span<const float> xyz) {
    text += '[';
    for (std::size_t i = 0; i < xyz.size(); ++i) {
        text += i % 3 != 0 ? ", " : i == 0 ? "(" : "), (";
        append(text, static_cast<double>(xyz[i]), 9);
    }
    text += xyz.empty() ? "]" : ")]";
}

void writeList(std::ostream& out, const char* name, const std::vector<std::uint32_t>& numbers) {
    std::string line;
    for (const std::uint32_t number : numbers)
        line += (line.empty() ? "" : ", ") + std::to_string(number);
    out << "    int[] " << name << " = [" << line << "]\n";
}

// by corner, as what reads USD takes it to a seam
void writeUvs(std::ostream& out, const MeshPolygons& polygons) {
    if (polygons.uvs.empty())
        return;
    std::string line = "[";
    for (std::size_t i = 0; i < polygons.uvs.size(); ++i) {
        line += i % 2 != 0 ? ", " : i == 0 ? "(" : "), (";
        append(line, static_cast<double>(polygons.uvs[i]), 9);
    }
    out << "    texCoord2f[] primvars:st = " << line << ")] (\n        interpolation = \"faceVarying\"\n    )\n";
    writeList(out, "primvars:st:indices", polygons.uvCorners);
}

bool isLetter(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
}

} // namespace

std::string primName(const std::string& text) {
    std::string name = text;
    for (char& c : name)
        if (!isLetter(c) && !(c >= '0' && c <= '9'))
            c = '_';
    return name.empty() || !isLetter(name.front()) ? "_" + name : name;
}

UsdFile::UsdFile(const std::filesystem::path& path, const MeshPolygons& polygons, ClipMotion motion)
    : file_(path)
    , motion_(std::move(motion))
    , vertexCount_(polygons.vertexCount)
    , uvBytes_(bytesPerUv * (polygons.uvs.size() / 2) + bytesPerIndex * polygons.uvCorners.size()) {
    writeHead(polygons);
}

void UsdFile::writeHead(const MeshPolygons& polygons) {
    std::ostream& out = file_.stream();
    const std::string name = primName(motion_.meshName);
    const std::string rate = decimal(motion_.framesPerSecond);
    const FrameRange& frames = motion_.frames;
    out << "#usda 1.0\n(\n    defaultPrim = \"" << name << "\"\n    endTimeCode = " << frames.frame(frames.count() - 1)
        << "\n    framesPerSecond = " << rate << "\n    metersPerUnit = " << decimal(motion_.metersPerUnit)
        << "\n    startTimeCode = " << frames.first << "\n    timeCodesPerSecond = " << rate << "\n    upAxis = \""
        << (motion_.isZUp ? 'Z' : 'Y') << "\"\n)\n\ndef Mesh \"" << name
        << "\"\n{\n    uniform token subdivisionScheme = \"none\"\n";
    writeList(out, "faceVertexCounts", polygons.sizes);
    writeList(out, "faceVertexIndices", polygons.corners);
    writeUvs(out, polygons);
    out << "    point3f[] points.timeSamples = {\n";
}

std::uint64_t UsdFile::expectedBytes() const {
    return bytesPerPoint * vertexCount_ * motion_.frames.count() + uvBytes_;
}

void UsdFile::add(int frame, std::span<const float> xyz) {
    Box box{};
    for (std::size_t i = 0; i < xyz.size(); ++i) {
        float& low = box.at(i % 3);
        float& high = box.at(3 + i % 3);
        low = i < 3 ? xyz[i] : std::min(low, xyz[i]);
        high = i < 3 ? xyz[i] : std::max(high, xyz[i]);
    }
    frames_.push_back(frame);
    boxes_.push_back(box);
    line_ = "        " + std::to_string(frame) + ": ";
    appendPoints(line_, xyz);
    file_.stream() << line_ << ",\n";
}

void UsdFile::finish() {
    std::ostream& out = file_.stream();
    out << "    }\n    float3[] extent.timeSamples = {\n";
    for (std::size_t i = 0; i < frames_.size(); ++i) {
        line_ = "        " + std::to_string(frames_[i]) + ": ";
        appendPoints(line_, boxes_[i]);
        out << line_ << ",\n";
    }
    out << "    }\n}\n";
    file_.finish();
}

} // namespace quarn
