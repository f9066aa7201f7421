// SPDX-License-Identifier: Apache-2.0
// A program outside of the project: moves points with the installed library and checks where they went.
#include <quill/bulk.h>
#include <quill/mat4d.h>
#include <quill/val3.h>

#include <iostream>
#include <vector>

int main() {
    quill::mat4d move;
    move(3, 0) = 10;
    move(3, 2) = -1;
    std::vector<quill::val3<float>> points(1000, {1, 2, 3});
    quill::multAsPoint(points, move);

    const quill::val3<float> expected{11, 2, 2};
    for (const quill::val3<float>& point : points) {
        if (point != expected) {
            std::cerr << "a point went to " << point << " instead of " << expected << '\n';
            return 1;
        }
    }
    return 0;
}
