// SPDX-License-Identifier: Apache-2.0
#include "nw_model/PrincipalShapes.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <string>

#include "json.h"
#include "printLine.h"
#include "readers.h"

namespace neuralWarp {
namespace {

static_assert(storage::jsonRules::principalShapes.mostBytes == principalShapesFileLimit);

/// Half a step of the last place above the largest float: what lies below still rounds to a finite value.
constexpr double floatRoundingLimit = 0x1.ffffffp+127;

bool fitsFloat(const json::Value& value) {
    return value.IsNumber() && std::fabs(value.GetDouble()) < floatRoundingLimit;
}

/// Why a value of the list is no shape; empty when it is one.
std::string whyNoShape(const json::Value& value, std::uint64_t coordinates) {
    if (!value.IsArray()) {
        return "is no array";
    }
    if (value.Size() < coordinates) {
        return "has " + std::to_string(value.Size()) + " numbers, and " + std::to_string(coordinates) + " are needed";
    }
    const json::Value* bad = std::find_if_not(value.Begin(), value.End(), fitsFloat);
    return bad == value.End() ? ""
                              : "has no number that a float can hold at place " + std::to_string(bad - value.Begin());
}

/// Transposes the list of shapes into vertex-major order. Every shape holds at least 3 * vertCount numbers, so the size
/// reserved is bounded by what the document holds.
void appendVertexMajor(std::vector<float>& values, const json::Value& list, std::uint64_t vertCount) {
    values.reserve(std::size_t{3} * list.Size() * vertCount);
    for (rapidjson::SizeType first = 0; first < 3 * vertCount; first += 3) {
        for (const json::Value& shape : list.GetArray()) {
            for (rapidjson::SizeType i = first; i < first + 3; ++i) {
                values.push_back(static_cast<float>(shape[i].GetDouble()));
            }
        }
    }
}

bool readShapes(PrincipalShapes& shapes, const json::Value& root, const std::filesystem::path& path) {
    const json::Value* list = json::find(root, "principalShapes");
    const std::uint64_t found = list != nullptr && list->IsArray() ? list->Size() : 0;
    if (found != shapes.shapeCount) {
        printLine("Error: principalShapeCount does not match the number of principal shapes\n");
        return false;
    }
    const std::uint64_t coordinates = 3 * shapes.vertCount;
    for (rapidjson::SizeType shape = 0; shape < list->Size(); ++shape) {
        const std::string reason = whyNoShape((*list)[shape], coordinates);
        if (!reason.empty()) {
            return json::refuse(path, "shape " + std::to_string(shape) + " " + reason);
        }
    }
    appendVertexMajor(shapes.values, *list, shapes.vertCount);
    return true;
}

} // namespace

bool readPrincipalShapes(PrincipalShapes& shapes, std::streambuf& source, const std::filesystem::path& path) {
    json::Document root;
    if (!json::parseObject(root, source, path, storage::jsonRules::principalShapes)) {
        return false;
    }
    shapes.shapeCount = json::readUint(root, "principalShapeCount", 0);
    shapes.vertCount = json::readUint(root, "principalVertCount", 0);
    if (shapes.vertCount == 0) {
        shapes.vertCount = json::readUint(root, "vertCount", 0);
    }
    if (shapes.shapeCount == 0 || shapes.vertCount == 0) {
        return true;
    }
    if (!readShapes(shapes, root, path)) {
        shapes.shapeCount = 0;
        return false;
    }
    return true;
}

bool readPrincipalShapesFile(const std::filesystem::path& path, std::vector<float>& values, std::uint64_t& shapeCount,
                             std::uint64_t& vertCount) noexcept {
    values.clear();
    shapeCount = 0;
    vertCount = 0;
    try {
        std::filebuf file;
        PrincipalShapes shapes;
        const bool ok =
            json::open(file, path, storage::jsonRules::principalShapes) && readPrincipalShapes(shapes, file, path);
        values.swap(shapes.values);
        shapeCount = shapes.shapeCount;
        vertCount = shapes.vertCount;
        return ok;
    } catch (...) {
        return json::refuseByException(path);
    }
}

} // namespace neuralWarp
