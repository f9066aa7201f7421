// SPDX-License-Identifier: Apache-2.0
// neuralwarp.evaluate_characters
#include "python/arrays.h"
#include "python/core.h"
#include "python/interrupts.h"

#include "nw_deform/deformCharacters.h"

#include <cstddef>
#include <string>
#include <vector>

namespace neuralWarp::python {

namespace py = pybind11;

namespace {

/// The arrays of all characters, by argument.
struct Arrays {
    std::vector<FloatArray> points, controls, weights, out;
};

std::string place(const char* argument, std::size_t i) {
    return std::string(argument) + "[" + std::to_string(i) + "]";
}

void checkLength(const char* argument, const py::sequence& values, std::size_t count) {
    if (values.size() != count)
        throw py::value_error(std::string(argument) + ": expected " + std::to_string(count) +
                              " elements, one for each character, got " + std::to_string(values.size()));
}

py::sequence listOf(const char* argument, const py::object& values, std::size_t count) {
    if (!py::isinstance<py::sequence>(values))
        throw py::value_error(std::string(argument) + ": expected a list, got a " + typeNameOf(values));
    auto list = py::reinterpret_borrow<py::sequence>(values);
    checkLength(argument, list, count);
    return list;
}

std::vector<Deformer*> deformersOf(const py::sequence& list) {
    std::vector<Deformer*> deformers;
    for (std::size_t i = 0; i < list.size(); ++i) {
        const py::object item = list[i];
        if (!py::isinstance<Deformer>(item))
            throw py::value_error(place("deformers", i) + ": expected a Deformer, got a " + typeNameOf(item));
        deformers.push_back(item.cast<Deformer*>());
    }
    return deformers;
}

void add(Arrays& arrays, const Deformer& deformer, std::size_t i, const py::object& points, const py::object& controls,
         const py::object& out, const py::object& weights) {
    const auto count = static_cast<py::ssize_t>(deformer.vertexCount());
    arrays.points.push_back(floatsOf(points, place("points", i), {count, 3}));
    arrays.controls.push_back(
        floatsOf(controls, place("controls", i), {static_cast<py::ssize_t>(deformer.model()->controlCount())}));
    arrays.weights.push_back(weights.is_none() ? FloatArray() : floatsOf(weights, place("weights", i), {count}));
    arrays.out.push_back(resultIn(out, place("out", i), {count, 3}));
}

void checkAllApart(const Arrays& arrays) {
    std::vector<NamedArray> named;
    for (std::size_t i = 0; i < arrays.out.size(); ++i) {
        named.push_back({arrays.out[i], place("out", i), true});
        named.push_back({arrays.points[i], place("points", i), false});
        named.push_back({arrays.controls[i], place("controls", i), false});
        named.push_back({arrays.weights[i], place("weights", i), false});
    }
    checkApart(named);
}

py::list evaluateCharacters(const py::sequence& deformers, const py::object& points, const py::object& controls,
                            const py::object& out, double envelope, const py::object& weights) {
    const std::vector<Deformer*> all = deformersOf(deformers);
    const std::size_t count = all.size();
    const py::sequence pointList = listOf("points", points, count);
    const py::sequence controlList = listOf("controls", controls, count);
    const py::object outList = out.is_none() ? py::object() : listOf("out", out, count);
    const py::object weightList = weights.is_none() ? py::object() : listOf("weights", weights, count);
    const auto of = [](const py::object& list, std::size_t i) -> py::object {
        return list ? py::object(list[py::int_(i)]) : py::none();
    };
    Arrays arrays;
    for (std::size_t i = 0; i < count; ++i)
        add(arrays, *all[i], i, pointList[i], controlList[i], of(outList, i), of(weightList, i));
    if (outList)
        checkAllApart(arrays);
    std::vector<CharacterFrame> frames;
    py::list results;
    for (std::size_t i = 0; i < count; ++i) {
        const FloatArray& values = arrays.controls[i];
        const float* const each = arrays.weights[i].size() != 0 ? arrays.weights[i].data() : nullptr;
        frames.push_back({all[i],
                          {arrays.points[i].data(),
                           {values.data(), static_cast<std::size_t>(values.size())},
                           static_cast<float>(envelope),
                           each},
                          arrays.out[i].mutable_data()});
        results.append(arrays.out[i]);
    }
    withoutGil([&](const IsCancelled& isCancelled) { deformCharacters(frames, isCancelled); });
    return results;
}

} // namespace

void addCharacters(py::module_& module) {
    module.def("evaluate_characters", &evaluateCharacters, py::arg("deformers"), py::arg("points"), py::arg("controls"),
               py::arg("out") = py::none(), py::arg("envelope") = 1.0, py::arg("weights") = py::none(),
               R"(evaluate_characters(deformers, points, controls, out=None, envelope=1.0, weights=None) -> list

Deformer.evaluate() of many characters, side by side on all cores, to the same bits.

deformers: a list of different Deformers
points, controls, weights, out: lists of what evaluate() takes, one element each
envelope: of all characters
Raises what evaluate() raises for the first character that fails, with its number, after all have been tried.)");
}

} // namespace neuralWarp::python
