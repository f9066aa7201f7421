// SPDX-License-Identifier: Apache-2.0
// Source: the NPY format, version 1.0, as NumPy's documentation of numpy.lib.format describes it.
#include "quarn/import/vertexMap.h"

#include "quarn/files/WholeFile.h"

#include <string>

namespace quarn {
namespace {

constexpr std::size_t headSize = 128; // a multiple of 64, with room for any count

std::string npyHead(std::size_t count) {
    std::string head("\x93NUMPY\x01\x00", 8);
    constexpr std::size_t textSize = headSize - 10;
    head += static_cast<char>(textSize);
    head += '\0';
    head += "{'descr': '<i4', 'fortran_order': False, 'shape': (" + std::to_string(count) + ",), }";
    head.resize(headSize - 1, ' ');
    return head + '\n';
}

} // namespace

void writeVertexMap(const std::filesystem::path& path, const std::vector<std::uint32_t>& sceneVertexOf) {
    WholeFile file(path);
    std::string bytes = npyHead(sceneVertexOf.size());
    bytes.reserve(headSize + 4 * sceneVertexOf.size());
    for (const std::uint32_t vertex : sceneVertexOf)
        for (unsigned shift = 0; shift < 32; shift += 8)
            bytes += static_cast<char>(vertex >> shift & 0xffU);
    file.stream().write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
    file.finish();
}

} // namespace quarn
