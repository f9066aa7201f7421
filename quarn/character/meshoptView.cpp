// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/meshoptView.h"

#include <meshoptimizer.h>

namespace quarn {
namespace {

[[noreturn]] void refuse(const std::string& owner, const std::string& what) {
    throw std::runtime_error(owner + ": its meshopt compression " + what);
}

bool strideFits(const MeshoptLayout& layout) {
    if (layout.mode != "ATTRIBUTES")
        return layout.stride == 2 || layout.stride == 4;
    if (layout.filter == "OCTAHEDRAL")
        return layout.stride == 4 || layout.stride == 8;
    if (layout.filter == "QUATERNION")
        return layout.stride == 8;
    return layout.stride % 4 == 0 && layout.stride >= 4 && layout.stride <= 256;
}

int decode(const MeshoptLayout& layout, std::string_view bytes, std::string& values) {
    const auto* data = reinterpret_cast<const unsigned char*>(bytes.data());
    if (layout.mode == "ATTRIBUTES")
        return meshopt_decodeVertexBuffer(values.data(), layout.count, layout.stride, data, bytes.size());
    if (layout.mode == "TRIANGLES")
        return meshopt_decodeIndexBuffer(values.data(), layout.count, layout.stride, data, bytes.size());
    return meshopt_decodeIndexSequence(values.data(), layout.count, layout.stride, data, bytes.size());
}

void undoFilter(const MeshoptLayout& layout, std::string& values) {
    if (layout.filter == "OCTAHEDRAL")
        meshopt_decodeFilterOct(values.data(), layout.count, layout.stride);
    else if (layout.filter == "QUATERNION")
        meshopt_decodeFilterQuat(values.data(), layout.count, layout.stride);
    else if (layout.filter == "EXPONENTIAL")
        meshopt_decodeFilterExp(values.data(), layout.count, layout.stride);
}

} // namespace

// the library asserts what is checked here
MeshoptLayout meshoptLayout(const JsonValue& extension, const std::string& owner) {
    MeshoptLayout layout{sizeOf(extension, "byteStride", 0, owner), sizeOf(extension, "count", 0, owner),
                         textOf(extension, "mode"), textOf(extension, "filter")};
    if (layout.filter.empty())
        layout.filter = "NONE";
    if (layout.mode != "ATTRIBUTES" && layout.mode != "TRIANGLES" && layout.mode != "INDICES")
        refuse(owner, "has the mode \"" + layout.mode + "\", which is not known");
    if (layout.filter != "NONE" && layout.filter != "OCTAHEDRAL" && layout.filter != "QUATERNION" &&
        layout.filter != "EXPONENTIAL")
        refuse(owner, "has the filter \"" + layout.filter + "\", which is not known");
    if (layout.filter != "NONE" && layout.mode != "ATTRIBUTES")
        refuse(owner, "has a filter for indices");
    if (!strideFits(layout))
        refuse(owner, "has a stride of " + std::to_string(layout.stride) + " bytes, which does not fit its mode");
    if (layout.mode == "TRIANGLES" && layout.count % 3 != 0)
        refuse(owner, "has triangles of " + std::to_string(layout.count) + " corners");
    return layout;
}

std::string meshoptDecoded(const MeshoptLayout& layout, std::string_view bytes, const std::string& owner) {
    std::string values(layout.count * layout.stride, '\0');
    if (layout.count > 0 && decode(layout, bytes, values) != 0)
        refuse(owner, "is damaged");
    undoFilter(layout, values);
    return values;
}

} // namespace quarn
