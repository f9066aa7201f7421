// SPDX-License-Identifier: Apache-2.0
// `planted_race race` sums into one element from every task of a parallel loop, which the thread sanitizer must report;
// `planted_race disjoint` is the same loop with one element for each index, which it must not.
#include <tbb/parallel_for.h>

#include <cstddef>
#include <cstdio>
#include <string_view>
#include <vector>

int main(int argc, char** argv) {
    const bool race = argc > 1 && std::string_view(argv[1]) == "race";
    const std::vector<int> a(100000, 1);
    std::vector<int> b(a.size());
    tbb::parallel_for(std::size_t{0}, a.size(), [&](std::size_t i) { b[race ? 0 : i] += a[i]; });
    std::printf("%d\n", b[0]);
    return 0;
}
