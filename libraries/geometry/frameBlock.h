// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quill/mat4d.h"
#include "quill/val3.h"

#include <array>
#include <cstddef>
#include <cstdint>

namespace quill {

// What frames are measured on: pair tables (see VertexFrames) and positions for every vertex they name. Plain pointers
// into checked arrays.
struct FrameTables {
    const std::uint32_t* pairs;
    const std::uint32_t* indexer; // [vertexCount + 1]
    std::size_t vertexCount;      // vertices from here on have no pairs
    const val3<float>* positions;

    bool hasPairs(std::size_t vertex) const { return vertex < vertexCount && indexer[vertex] != indexer[vertex + 1]; }

    // The sum of a vertex's corner normals in pair order, its length the area they span; zero without pairs.
    val3<float> normalSum(std::size_t vertex) const;
};

// Frames of a few vertices at a time. The square roots and divisions of one frame wait for each other; laid out by
// component, those of several vertices are done together. Each vertex's own operations and their order stay the same.
class FrameBlock {
public:
    static constexpr std::size_t capacity = 64;

    // Measures the unit normals of `count` <= capacity vertices.
    void measureNormals(const FrameTables& tables, const std::size_t* vertices, std::size_t count);
    // Takes given unit normals, indexed by vertex, instead.
    void takeNormals(const val3<float>* normals, const std::size_t* vertices, std::size_t count);

    // Builds the axes of the frames of the same vertices on those normals.
    void buildAxes(const FrameTables& tables, const std::size_t* vertices, std::size_t count);

    // Writes the frame of the j-th of those vertices, element by element: a frame that is returned and copied costs as
    // much again as its arithmetic.
    void write(const FrameTables& tables, std::size_t j, std::size_t vertex, mat4d& frame) const {
        if (tables.hasPairs(vertex)) {
            writeRow(frame, 0, {x_.x[j], x_.y[j], x_.z[j]}, 0.0);
            writeRow(frame, 1, {y_.x[j], y_.y[j], y_.z[j]}, 0.0);
            writeRow(frame, 2, {normal_.x[j], normal_.y[j], normal_.z[j]}, 0.0);
        } else {
            frame.setToIdentity();
        }
        writeRow(frame, 3, tables.positions[vertex], 1.0);
    }

private:
    struct Vectors {
        alignas(32) std::array<float, capacity> x, y, z;

        void set(std::size_t j, const val3<float>& v) { x[j] = v.x, y[j] = v.y, z[j] = v.z; }
    };
    static void normalize(Vectors& v, std::size_t count);
    static void cross(const Vectors& a, const Vectors& b, Vectors& out, std::size_t count);
    static void writeRow(mat4d& frame, std::size_t r, const val3<float>& v, double last) {
        double* const row = frame.m.data() + 4 * r;
        row[0] = v.x, row[1] = v.y, row[2] = v.z, row[3] = last;
    }

    Vectors normal_, tangent_, x_, y_;
};

} // namespace quill
