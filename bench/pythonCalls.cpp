// SPDX-License-Identifier: Apache-2.0
// bench_python_calls, an extension module for python_calls.py: the calls that the module neuralwarp makes, without the
// module, on its own objects. They are those of its _core, which must have been imported.
#include "nw_deform/deformCharacters.h"
#include "plugin/deformer/support/modelFolder.h"

#include <pybind11/numpy.h>
#include <pybind11/stl.h>

#include <chrono>
#include <random>
#include <string>
#include <vector>

namespace {

namespace py = pybind11;
using Array = py::array_t<float, py::array::c_style>;

/// Surface deltas of twenty shapes by a network as the trainer makes them, with numbers drawn at random.
void writeGrid(const std::string& directory, std::uint32_t vertices) {
    std::mt19937 random(1);
    const auto some = [&](std::size_t count) {
        std::vector<float> values(count);
        for (float& value : values)
            value = static_cast<float>(random()) / 4.3e9F - 0.5F;
        return values;
    };
    ModelSpec spec;
    spec.controls = 24;
    spec.hidden = {64, 64};
    spec.bias = some(20);
    spec.weights = some(spec.hidden.back() * 20);
    for (int shape = 0; shape < 20; ++shape)
        spec.shapes.push_back(some(std::size_t{3} * vertices));
    spec.smoothingIterations = 5;
    spec.fullCount = spec.affectCount = vertices;
    writeModel(directory, spec);
}

std::vector<neuralWarp::CharacterFrame> framesOf(const std::vector<neuralWarp::Deformer*>& deformers,
                                                 const std::vector<Array>& points, const std::vector<Array>& controls,
                                                 std::vector<Array>& out) {
    std::vector<neuralWarp::CharacterFrame> frames;
    for (std::size_t i = 0; i < deformers.size(); ++i)
        frames.push_back({deformers[i],
                          {points[i].data(), {controls[i].data(), static_cast<std::size_t>(controls[i].size())}},
                          out[i].mutable_data()});
    return frames;
}

/// Seconds of `count` calls for all characters, one after another or side by side.
double secondsOf(const std::vector<neuralWarp::Deformer*>& deformers, const std::vector<Array>& points,
                 const std::vector<Array>& controls, std::vector<Array> out, int count) {
    const auto frames = framesOf(deformers, points, controls, out);
    const py::gil_scoped_release released;
    const auto begin = std::chrono::steady_clock::now();
    for (int i = 0; i < count; ++i)
        if (frames.size() == 1)
            frames[0].deformer->evaluate(frames[0].pose, frames[0].out);
        else
            neuralWarp::deformCharacters(frames);
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
}

} // namespace

PYBIND11_MODULE(bench_python_calls, module) {
    module.def("write_model", &writeGrid);
    module.def("seconds_of", &secondsOf);
}
