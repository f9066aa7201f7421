// SPDX-License-Identifier: Apache-2.0
#include "python/scene/values.h"

#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnData.h"
#include "openquarn/HMatrix.h"
#include "openquarn_app/Commands.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/sliders.h"
#include "storage/finite.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <span>
#include <stdexcept>

namespace python {
namespace {

namespace py = pybind11;

std::string nameOf(const HPlug& plug) {
    return plug.name().asChar();
}

enum class Kind { boolean, whole, choice, real, text, matrix, list, mesh, compound, other };

Kind kindOfNumber(const HObject& attribute) {
    switch (HFnNumericAttribute(attribute).numericType()) {
    case HFnNumericData::kBoolean:
        return Kind::boolean;
    case HFnNumericData::kShort:
    case HFnNumericData::kInt:
        return Kind::whole;
    default:
        return Kind::real;
    }
}

Kind kindOfData(const HObject& attribute) {
    switch (HFnTypedAttribute(attribute).attrType()) {
    case HFnData::kString:
        return Kind::text;
    case HFnData::kMatrix:
        return Kind::matrix;
    case HFnData::kDoubleArray:
        return Kind::list;
    case HFnData::kMesh:
        return Kind::mesh;
    default:
        return Kind::other;
    }
}

Kind kindOf(const HPlug& plug) {
    const HObject attribute = plug.attribute();
    switch (attribute.apiType()) {
    case HFn::kNumericAttribute:
        return kindOfNumber(attribute);
    case HFn::kEnumAttribute:
        return Kind::choice;
    case HFn::kTypedAttribute:
        return kindOfData(attribute);
    case HFn::kMatrixAttribute:
        return Kind::matrix;
    case HFn::kCompoundAttribute:
        return Kind::compound;
    default:
        return Kind::other;
    }
}

py::object matrixOf(const HPlug& plug) {
    const HMatrix value = plug.asMatrix();
    py::array_t<double> array({4, 4});
    std::memcpy(array.mutable_data(), value.matrix, sizeof(value.matrix));
    return array;
}

py::object listOf(const HPlug& plug) {
    const std::vector<double> values = HFnDoubleArrayData(plug.asHObject()).values();
    py::list list;
    for (const double value : values)
        list.append(value);
    return list;
}

// of a plug that has been evaluated
py::object leafValue(Visit& visit, const HPlug& plug) {
    switch (kindOf(plug)) {
    case Kind::boolean:
        return py::bool_(plug.asBool());
    case Kind::whole:
    case Kind::choice:
        return py::int_(plug.asInt());
    case Kind::real:
        return py::float_(plug.asDouble());
    case Kind::text:
        return py::str(plug.asString().asStdString());
    case Kind::matrix:
        return matrixOf(plug);
    case Kind::list:
        return listOf(plug);
    case Kind::mesh:
        return plug.asHObject().isNull() ? py::none() : py::object(pointsOf(visit, plug, std::nullopt));
    default:
        throw std::invalid_argument(nameOf(plug) + " holds nothing that Python can be given");
    }
}

py::object evaluatedValue(Visit& visit, const HPlug& plug) {
    const bool isArray = plug.isArray();
    if (!isArray && !plug.isCompound())
        return leafValue(visit, plug);
    const unsigned count = isArray ? plug.numElements() : plug.numChildren();
    py::list values;
    for (unsigned i = 0; i < count; ++i)
        values.append(evaluatedValue(visit, isArray ? plug.elementByPhysicalIndex(i) : plug.child(i)));
    return values;
}

[[noreturn]] void refuseType(const HPlug& plug, const char* expected, const py::handle& value) {
    throw py::type_error(nameOf(plug) + " takes " + expected + ", not " +
                         std::string(py::str(py::type::of(value).attr("__name__"))));
}

void must(const HStatus& status) {
    if (status.error())
        throw std::invalid_argument(status.errorString().asStdString());
}

double numberFrom(const HPlug& plug, const py::handle& value) {
    const bool isText = py::isinstance<py::str>(value) || py::isinstance<py::bytes>(value);
    const double number = isText ? -1.0 : PyFloat_AsDouble(value.ptr());
    if (isText || PyErr_Occurred() != nullptr) {
        PyErr_Clear();
        refuseType(plug, kindOf(plug) == Kind::choice ? "a number or a label" : "a number", value);
    }
    return number;
}

// by the command, whose rule for numbers that do not fit is that of scene files
void setWord(const HPlug& plug, const std::string& word) {
    const OpenQuarn::CommandOutcome outcome =
        OpenQuarn::runCommand("setAttr " + OpenQuarn::quotedWord(nameOf(plug)) + " " + OpenQuarn::quotedWord(word));
    constexpr std::string_view command = "setAttr: ";
    if (!outcome)
        throw std::invalid_argument(outcome.error.starts_with(command) ? outcome.error.substr(command.size())
                                                                       : outcome.error);
}

void setOtherNumber(const HPlug& plug, const py::handle& value) {
    if (kindOf(plug) == Kind::choice && py::isinstance<py::str>(value))
        return setWord(plug, value.cast<std::string>());
    const double number = numberFrom(plug, value);
    setWord(plug, std::isfinite(number) ? OpenQuarn::printedValue(number) : std::to_string(number));
}

std::vector<double> numbersFrom(const HPlug& plug, const py::handle& value, const char* expected) {
    if (value.is_none()) // NumPy makes a number of it
        refuseType(plug, expected, value);
    const auto array = py::array_t<double, py::array::c_style | py::array::forcecast>::ensure(value);
    if (!array) {
        PyErr_Clear();
        refuseType(plug, expected, value);
    }
    std::vector<double> numbers(array.data(), array.data() + array.size());
    if (!std::all_of(numbers.begin(), numbers.end(), [](double number) { return std::isfinite(number); }))
        throw std::invalid_argument(nameOf(plug) + " takes finite numbers only");
    return numbers;
}

void setMatrix(HPlug plug, const py::handle& value) {
    const char* expected = "a matrix of 4 by 4 numbers";
    const std::vector<double> numbers = numbersFrom(plug, value, expected);
    HMatrix matrix;
    constexpr std::size_t size = 16;
    if (numbers.size() != size)
        throw std::invalid_argument(nameOf(plug) + " takes " + expected + ", not " + std::to_string(numbers.size()));
    std::memcpy(matrix.matrix, numbers.data(), sizeof(matrix.matrix));
    must(plug.setMatrix(matrix));
}

void setText(const OpenScene& scene, HPlug plug, const py::handle& value) {
    if (!py::isinstance<py::str>(value))
        refuseType(plug, "a text", value);
    must(plug.setString(HString(scene.textFor(plug, value.cast<std::string>()))));
}

void setParts(OpenScene& scene, const HPlug& plug, const py::handle& value) {
    const bool isArray = plug.isArray();
    const char* expected = isArray ? "a sequence of its elements" : "a sequence of its parts";
    if (!py::isinstance<py::sequence>(value) || py::isinstance<py::str>(value))
        refuseType(plug, expected, value);
    const auto parts = py::reinterpret_borrow<py::sequence>(value);
    if (!isArray && parts.size() != plug.numChildren())
        throw std::invalid_argument(nameOf(plug) + " has " + std::to_string(plug.numChildren()) + " parts, not " +
                                    std::to_string(parts.size()));
    for (unsigned i = 0; i < parts.size(); ++i)
        setValue(scene, isArray ? plug.elementByLogicalIndex(i) : plug.child(i), py::object(parts[i]));
}

template <class Sizes>
std::string shapeText(const Sizes& sizes, std::size_t count) {
    std::string text;
    for (std::size_t i = 0; i < count; ++i)
        text += (i > 0 ? ", " : "") + std::to_string(sizes[i]);
    return "[" + text + "]";
}

} // namespace

HPlug plugNamed(const std::string& name) {
    try {
        return quarn::findControl(name);
    } catch (const std::runtime_error& error) {
        throw std::invalid_argument(error.what());
    }
}

bool isNumber(const HPlug& plug) {
    return !plug.isArray() && kindOf(plug) <= Kind::real;
}

bool isReal(const HPlug& plug) {
    return kindOf(plug) == Kind::real;
}

void setReal(const HPlug& plug, double number) {
    if (!std::isfinite(number))
        throw std::invalid_argument(nameOf(plug) + " cannot be set: " + std::to_string(number) +
                                    " is not a finite number");
    HPlug target = plug;
    must(target.setDouble(number));
}

py::object valueOf(Visit& visit, const HPlug& plug) {
    visit.evaluate(plug);
    return evaluatedValue(visit, plug);
}

void setValue(OpenScene& scene, const HPlug& plug, const py::handle& value) {
    if (plug.isArray() || plug.isCompound())
        return setParts(scene, plug, value);
    switch (kindOf(plug)) {
    case Kind::real:
    case Kind::boolean:
    case Kind::whole:
    case Kind::choice:
        return setOtherNumber(plug, value);
    case Kind::text:
        return setText(scene, plug, value);
    case Kind::matrix:
        return setMatrix(plug, value);
    case Kind::list:
        return quarn::setList(plug, numbersFrom(plug, value, "a list of numbers"));
    default:
        throw std::invalid_argument(nameOf(plug) + " holds nothing that Python can set");
    }
}

FloatArray writable(const py::array& array, const std::vector<py::ssize_t>& shape, const char* name) {
    const bool isFloat = py::isinstance<FloatArray>(array);
    const bool fits = isFloat && array.ndim() == static_cast<py::ssize_t>(shape.size()) &&
                      std::equal(shape.begin(), shape.end(), array.shape()) && array.writeable();
    if (fits)
        return py::reinterpret_borrow<FloatArray>(array);
    const auto dimensions = static_cast<std::size_t>(array.ndim());
    const bool isInOrder = (array.flags() & py::array::c_style) != 0;
    throw std::invalid_argument(std::string(name) + ": expected float32 " + shapeText(shape, shape.size()) +
                                ", C-contiguous and writable, got " + std::string(py::str(array.dtype())) + " " +
                                shapeText(array.shape(), dimensions) + (isInOrder ? "" : ", not C-contiguous") +
                                (array.writeable() ? "" : ", read-only"));
}

FloatArray pointsOf(Visit& visit, const HPlug& plug, const std::optional<py::array>& out) {
    if (kindOf(plug) != Kind::mesh || plug.isArray())
        throw std::invalid_argument(nameOf(plug) + " is no mesh");
    visit.evaluate(plug);
    const auto count = static_cast<py::ssize_t>(quarn::vertexCountOf(plug));
    FloatArray points = out ? writable(*out, {count, 3}, "out") : FloatArray({count, py::ssize_t{3}});
    const std::span<float> xyz(points.mutable_data(), static_cast<std::size_t>(points.size()));
    quarn::readPoints(plug, xyz);
    if (const std::optional<std::size_t> place = storage::firstNotFinite(xyz))
        throw std::runtime_error("vertex " + std::to_string(*place / 3) + " of " + nameOf(plug) +
                                 " has a coordinate that is no finite number");
    return points;
}

} // namespace python
