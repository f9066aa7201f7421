// SPDX-License-Identifier: Apache-2.0
#include "smoothingKernel.h"

namespace quill {
namespace {

struct ScalarLanes {
    struct Point {
        float x, y, z;
    };

    static Point load(const float* p) { return {p[0], p[1], p[2]}; }
    static void store(float* p, Point a) {
        p[0] = a.x;
        p[1] = a.y;
        p[2] = a.z;
    }
    static Point zero() { return {0.0F, 0.0F, 0.0F}; }
    static Point add(Point a, Point b) { return {a.x + b.x, a.y + b.y, a.z + b.z}; }
    static Point subtract(Point a, Point b) { return {a.x - b.x, a.y - b.y, a.z - b.z}; }
    static Point multiply(Point a, float s) { return {a.x * s, a.y * s, a.z * s}; }
    static Point divide(Point a, float s) { return {a.x / s, a.y / s, a.z / s}; }
};

} // namespace

void smoothScalar(const SmoothingPass& pass, const val3<float>* source, val3<float>* destination, std::size_t begin,
                  std::size_t end) {
    smooth<ScalarLanes>(pass, source, destination, begin, end);
}

} // namespace quill
