// SPDX-License-Identifier: Apache-2.0
// Compiled without errno for square roots, which otherwise keeps the loops from being vectorised.
#include "transportKernel.h"

#include <cmath>

namespace quill {
namespace {

struct PlainLanes {
    template <typename T>
    struct Eight {
        T v[transportLanes]; // NOLINT(modernize-avoid-c-arrays): no inline function of another header
    };
    using Floats = Eight<float>;
    using Doubles = Eight<double>;
    using Mask = Eight<bool>;

    template <typename T, typename Operation>
    static Eight<T> each(const Operation& operation) {
        Eight<T> result;
        for (std::size_t j = 0; j < transportLanes; ++j)
            result.v[j] = operation(j);
        return result;
    }

    template <typename T>
    static Eight<T> load(const T* p) {
        return each<T>([&](std::size_t j) { return p[j]; });
    }
    static Floats broadcast(float s) {
        return each<float>([&](std::size_t) { return s; });
    }
    template <typename T>
    static Eight<T> add(const Eight<T>& a, const Eight<T>& b) {
        return each<T>([&](std::size_t j) { return a.v[j] + b.v[j]; });
    }
    static Floats subtract(const Floats& a, const Floats& b) {
        return each<float>([&](std::size_t j) { return a.v[j] - b.v[j]; });
    }
    template <typename T>
    static Eight<T> multiply(const Eight<T>& a, const Eight<T>& b) {
        return each<T>([&](std::size_t j) { return a.v[j] * b.v[j]; });
    }
    static Floats reciprocalRoot(const Floats& a) {
        return each<float>([&](std::size_t j) { return 1.0F / std::sqrt(a.v[j]); });
    }
    static Mask isAbove(const Floats& a, float s) {
        return each<bool>([&](std::size_t j) { return a.v[j] > s; });
    }
    static Mask moreThan(const std::uint32_t* counts, std::uint32_t k) {
        return each<bool>([&](std::size_t j) { return counts[j] > k; });
    }
    static Floats select(const Mask& mask, const Floats& yes, const Floats& no) {
        return each<float>([&](std::size_t j) { return mask.v[j] ? yes.v[j] : no.v[j]; });
    }
    static Doubles widen(const Floats& a) {
        return each<double>([&](std::size_t j) { return static_cast<double>(a.v[j]); });
    }
    static Floats narrow(const Doubles& a) {
        return each<float>([&](std::size_t j) { return static_cast<float>(a.v[j]); });
    }
    static void loadRows(const float* rows, const std::uint32_t* indices, Floats& x, Floats& y, Floats& z) {
        for (std::size_t j = 0; j < transportLanes; ++j) {
            const float* const row = rows + 4 * static_cast<std::size_t>(indices[j]);
            x.v[j] = row[0], y.v[j] = row[1], z.v[j] = row[2];
        }
    }
    static void loadPoints(const float* p, Floats& x, Floats& y, Floats& z) {
        for (std::size_t j = 0; j < transportLanes; ++j)
            x.v[j] = p[3 * j], y.v[j] = p[3 * j + 1], z.v[j] = p[3 * j + 2];
    }
    static void storePoints(float* p, const Floats& x, const Floats& y, const Floats& z) {
        for (std::size_t j = 0; j < transportLanes; ++j)
            p[3 * j] = x.v[j], p[3 * j + 1] = y.v[j], p[3 * j + 2] = z.v[j];
    }
};

} // namespace

void transportScalar(const TransportTables& tables, const float* rows, const val3<float>* deltas, val3<float>* out,
                     std::size_t begin, std::size_t end) {
    transport<PlainLanes>(tables, rows, deltas, out, begin, end);
}

} // namespace quill
