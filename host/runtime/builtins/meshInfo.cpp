// SPDX-License-Identifier: Apache-2.0
// meshInfo: what can be said of a mesh in one line.
#include "builtins/Builtin.h"
#include "builtins/builtins.h"
#include "builtins/names.h"
#include "geometry/MeshData.h"
#include "graph/evaluation.h"
#include "graph/plugImpl.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>

namespace OpenQuarn {
namespace {

using Triple = std::array<double, 3>;

/// Six digits, for reading; in every locale.
std::string rounded(double value) {
    std::array<char, 32> text{};
    const auto end = std::to_chars(text.data(), text.data() + text.size(), value, std::chars_format::general, 6);
    return {text.data(), end.ptr};
}

std::string printed(const Triple& point) {
    return rounded(point[0]) + " " + rounded(point[1]) + " " + rounded(point[2]);
}

std::string counted(std::size_t count, const char* one, const char* many) {
    return std::to_string(count) + " " + (count == 1 ? one : many);
}

Triple pointAt(const MeshData& mesh, unsigned vertex) {
    const double* xyz = mesh.points->xyz() + std::size_t{3} * vertex;
    return {xyz[0], xyz[1], xyz[2]};
}

std::string describe(const MeshData& mesh) {
    std::string text = counted(mesh.vertexCount(), "vertex", "vertices") + ", " +
                       counted(mesh.topology->polygonCount(), "polygon", "polygons") +
                       (mesh.uvs ? ", " + counted(mesh.uvs->count(), "UV", "UVs") : "");
    if (mesh.vertexCount() == 0)
        return text;
    Triple low = pointAt(mesh, 0);
    Triple high = low;
    for (unsigned vertex = 1; vertex < mesh.vertexCount(); ++vertex) {
        const Triple point = pointAt(mesh, vertex);
        for (std::size_t axis = 0; axis < 3; ++axis) {
            low[axis] = std::min(low[axis], point[axis]);
            high[axis] = std::max(high[axis], point[axis]);
        }
    }
    return text + ", from " + printed(low) + " to " + printed(high);
}

std::string compare(const MeshData& mesh, const MeshData& other) {
    if (mesh.vertexCount() != other.vertexCount())
        throw std::invalid_argument("a mesh of " + counted(mesh.vertexCount(), "vertex", "vertices") +
                                    " cannot be compared with one of " + std::to_string(other.vertexCount()));
    double largest = 0.0;
    double sum = 0.0;
    unsigned farthest = 0;
    for (unsigned vertex = 0; vertex < mesh.vertexCount(); ++vertex) {
        const Triple a = pointAt(mesh, vertex);
        const Triple b = pointAt(other, vertex);
        const double distance = std::hypot(a[0] - b[0], a[1] - b[1], a[2] - b[2]);
        sum += distance;
        if (distance > largest) {
            largest = distance;
            farthest = vertex;
        }
    }
    const double mean = mesh.vertexCount() == 0 ? 0.0 : sum / mesh.vertexCount();
    return "mean distance " + rounded(mean) + ", largest " + rounded(largest) + " at vertex " +
           std::to_string(farthest);
}

std::shared_ptr<MeshData> evaluatedMesh(const std::string& name) {
    const HPlug plug = plugNamed(name);
    const std::shared_ptr<Slot> slot = slotToEvaluate(normalContext, plug);
    if (!slot)
        throw std::invalid_argument("'" + name + "' does not exist");
    if (const HStatus status = pull(slot); status.error())
        throw std::runtime_error(status.errorString().asStdString());
    auto mesh = std::dynamic_pointer_cast<MeshData>(resolvePlug(normalContext, plug)->data);
    if (!mesh)
        throw std::invalid_argument("'" + name + "' holds no mesh");
    return mesh;
}

class MeshInfo : public Builtin {
    HStatus run(const Arguments& args) override {
        const std::shared_ptr<MeshData> mesh = evaluatedMesh(args.text(0));
        give(args.has("to") ? compare(*mesh, *evaluatedMesh(args.flagText("to"))) : describe(*mesh));
        return {};
    }
};

} // namespace

void addMeshInfo(CommandRegistry& registry) {
    addBuiltin<MeshInfo>(registry, "meshInfo", "Evaluates a mesh and gives its size, or its distance to another.",
                         SyntaxBuilder().flag("to", "to", HSyntax::kString).arg());
}

} // namespace OpenQuarn
