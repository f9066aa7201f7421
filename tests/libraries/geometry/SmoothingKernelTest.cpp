// SPDX-License-Identifier: Apache-2.0
// Every smoothing kernel this processor can run gives the scalar kernel's bits and stays within its arrays.
#include "support/meshZoo.h"

#include "quill/VertexConnections.h"
#include "smoothing.h"

#include <gtest/gtest.h>

#include <cstring>
#include <limits>

namespace {

using quill::InstructionSet;
using Points = std::vector<quill::val3<float>>;

// The ranges a parallel loop may cut 0 .. n - 1 into: all, uneven halves, single vertices at both ends.
std::vector<std::pair<std::size_t, std::size_t>> ranges(std::size_t n) {
    return {{0, n}, {0, n / 3}, {n / 3, n}, {0, std::min<std::size_t>(n, 1)}, {n - std::min<std::size_t>(n, 1), n},
            {n, n}};
}

Points run(quill::SmoothingKernel kernel, const quill::SmoothingPass& pass, const Points& source, std::size_t begin,
           std::size_t end) {
    Points destination(source.size(), {-7, -7, -7});
    kernel(pass, source.data(), destination.data(), begin, end);
    return destination;
}

bool sameBits(const Points& a, const Points& b) {
    return a.size() == b.size() && std::memcmp(a.data(), b.data(), a.size() * sizeof(a[0])) == 0;
}

TEST(SmoothingKernel, EveryKernelGivesTheScalarBits) {
    std::vector<quill::SmoothingKernel> kernels;
    for (const InstructionSet set : {InstructionSet::plain, InstructionSet::avx, InstructionSet::avx512})
        if (set <= quill::processorInstructionSet())
            kernels.push_back(quill::smoothingKernel(set));
    const std::size_t count = kernels.size();
    ASSERT_EQ(kernels[0], &quill::smoothScalar);
    for (const ZooMesh& mesh : meshZoo()) {
        quill::IndexMapper map;
        map.setIdentity(mesh.vertexCount());
        quill::VertexConnections connections;
        connections.build(mesh.topology(), map, 1, false);
        Points source = mesh.points;
        source.push_back({1, 2, 3}); // beyond the tables: copied
        if (!source.empty())
            source[0] = {-0.0F, std::numeric_limits<float>::denorm_min(), 3e38F};
        std::vector<float> weights(connections.connections().size());
        for (std::size_t k = 0; k < weights.size(); ++k)
            weights[k] = 0.3F + 0.1F * static_cast<float>(k % 11);
        std::vector<std::uint8_t> mask(source.size());
        for (std::size_t i = 0; i < mask.size(); i += 4)
            mask[i] = 255;
        for (unsigned variant = 0; variant < 16; ++variant) {
            const quill::SmoothingPass pass{connections.connections().data(),
                                            connections.connectionsIndexer().data(),
                                            connections.vertexCount(),
                                            variant & 1 ? mask.data() : nullptr,
                                            variant & 2 ? weights.data() : nullptr,
                                            variant & 4 ? 0.3F : 1.0F,
                                            (variant & 4) == 0,
                                            (variant & 8) != 0};
            for (const auto& [begin, end] : ranges(source.size())) {
                const Points expected = run(kernels[0], pass, source, begin, end);
                for (std::size_t i = 0; i < source.size(); ++i)
                    if (i < begin || i >= end) {
                        ASSERT_EQ(expected[i].x, -7.0F) << "written outside of the range";
                    }
                for (std::size_t k = 1; k < count; ++k)
                    ASSERT_TRUE(sameBits(run(kernels[k], pass, source, begin, end), expected))
                        << mesh.name << ", variant " << variant << ", kernel " << k;
            }
        }
    }
}

} // namespace
