// SPDX-License-Identifier: Apache-2.0
// A model is read in another process: the runtime was not written for hostile files.
#include "quarn/console/interrupt.h"
#include "quarn/info/ModelReport.h"
#include "quarn/process/runApart.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <span>
#include <stdexcept>
#include <string_view>
#include <type_traits>
#include <utility>

namespace quarn {
namespace {

// Numbers, texts and lists as bytes, between two copies of one program.
class Packer {
public:
    template <class T>
    void operator()(const T& value) {
        static_assert(std::is_arithmetic_v<T> || std::is_enum_v<T>);
        append(&value, sizeof value);
    }
    void operator()(const std::string& text) { list(text); }
    template <class T>
    void operator()(const std::vector<T>& values) {
        list(values);
    }
    void operator()(const std::vector<std::string>& texts) {
        operator()(texts.size());
        for (const std::string& text : texts)
            operator()(text);
    }
    std::string take() { return std::move(bytes_); }

private:
    template <class List>
    void list(const List& values) {
        operator()(values.size());
        append(values.data(), values.size() * sizeof values[0]);
    }
    void append(const void* bytes, std::size_t size) { bytes_.append(static_cast<const char*>(bytes), size); }

    std::string bytes_;
};

// The other way; trusts nothing, and takes no memory for what is not there.
class Unpacker {
public:
    explicit Unpacker(std::string_view bytes)
        : bytes_(bytes) {}

    template <class T>
    void operator()(T& value) {
        static_assert(std::is_arithmetic_v<T> || std::is_enum_v<T>);
        copy(&value, sizeof value);
    }
    void operator()(bool& value) {
        char byte = 0;
        copy(&byte, 1);
        value = byte != 0;
    }
    void operator()(std::string& text) { list(text); }
    template <class T>
    void operator()(std::vector<T>& values) {
        list(values);
    }
    void operator()(std::vector<std::string>& texts) {
        texts.resize(count(sizeof(std::size_t)));
        for (std::string& text : texts)
            operator()(text);
    }

private:
    template <class List>
    void list(List& values) {
        values.resize(count(sizeof values[0]));
        copy(values.data(), values.size() * sizeof values[0]);
    }
    std::size_t count(std::size_t sizeOfEach) {
        std::size_t number = 0;
        copy(&number, sizeof number);
        if (number > bytes_.size() / sizeOfEach)
            refuse();
        return number;
    }
    void copy(void* to, std::size_t size) {
        if (size > bytes_.size())
            refuse();
        if (size > 0)
            std::memcpy(to, bytes_.data(), size);
        bytes_.remove_prefix(size);
    }
    [[noreturn]] static void refuse() { throw NoAnswer(NoAnswer::Why::crashed, "crashes"); }

    std::string_view bytes_;
};

// one list of members for both ways; `Answer` is const on the way out
template <class Archive, class Answer>
void transfer(Archive& archive, Answer& answer) {
    auto& model = answer.model;
    auto& metadata = model.metadata;
    archive(model.bytes), archive(model.inputs), archive(model.outputs), archive(model.hasShapes);
    archive(model.shapeCount), archive(model.shapeVertices), archive(model.problems);
    archive(metadata.loaded), archive(metadata.deltaCount), archive(metadata.deltaMode);
    archive(metadata.smoothingIterations), archive(metadata.affectCount), archive(metadata.fullCount);
    archive(metadata.affectMap), archive(metadata.subsetState), archive(metadata.componentTagExpression);
    archive(metadata.geometry), archive(answer.printed), archive(answer.outputs);
}

// each row through the network as it is, for those who want to know whether it does what they trained
std::vector<float> outputsOf(neuralWarp::ModelSession& session, const ModelReport& model, const FloatTable& controls) {
    if (controls.columns == 0)
        return {};
    if (model.outputs == 0)
        throw std::runtime_error(model.directory.string() + " has no network that can be run");
    if (controls.columns != model.inputs)
        throw std::runtime_error("each row of controls has " + std::to_string(controls.columns) +
                                 " numbers, and the network takes " + std::to_string(model.inputs));
    std::vector<float> outputs;
    for (std::size_t row = 0; row < controls.rows; ++row) {
        const auto given = session.run(std::span(controls.values).subspan(row * controls.columns, controls.columns));
        if (given.size() != model.outputs)
            throw std::runtime_error("row " + std::to_string(row) + ": " + session.errorText());
        outputs.insert(outputs.end(), given.begin(), given.end());
    }
    return outputs;
}

// in the process apart, whose standard output goes nowhere: what the readers print there becomes part of the answer
ModelAnswer answerOf(const std::filesystem::path& directory, const FloatTable& controls) {
    char* text = nullptr;
    std::size_t size = 0;
    stdout = open_memstream(&text, &size);
    ModelAnswer answer;
    neuralWarp::ModelSession session;
    answer.model = readModel(directory, session);
    answer.outputs = outputsOf(session, answer.model, controls);
    std::fclose(stdout);
    answer.printed.assign(text, size);
    return answer;
}

// the report is that of a process that may have been damaged
void check(const ModelAnswer& answer, std::size_t rows) {
    using neuralWarp::SubsetState;
    const SubsetState state = answer.model.metadata.subsetState;
    if (answer.outputs.size() / std::max<std::size_t>(rows, 1) != (rows == 0 ? 0 : answer.model.outputs) ||
        state < SubsetState::Unrecognized || state > SubsetState::Partial)
        throw NoAnswer(NoAnswer::Why::crashed, "crashes");
}

} // namespace

ModelAnswer readModelApart(const std::filesystem::path& directory, const FloatTable& controls) {
    if (!std::filesystem::is_directory(directory))
        throw std::runtime_error(directory.string() + " is no model directory");
    ApartLimits limits;
    limits.processorTime += std::chrono::seconds(controls.rows); // a network that takes a second a row is a large one
    limits.wallClock += std::chrono::seconds(controls.rows);
    ModelAnswer answer;
    try {
        const std::string bytes = runApart(
            [&] {
                Packer packer;
                transfer(packer, std::as_const(answer = answerOf(directory, controls)));
                return packer.take();
            },
            limits);
        Unpacker unpacker(bytes);
        transfer(unpacker, answer);
        check(answer, controls.columns == 0 ? 0 : controls.rows);
    } catch (const NoAnswer& none) {
        throw std::runtime_error(directory.string() + " is damaged: reading it " + none.what());
    } catch (const std::runtime_error&) {
        throwIfInterrupted(); // both processes have heard it
        throw;
    }
    answer.model.directory = directory;
    return answer;
}

} // namespace quarn
