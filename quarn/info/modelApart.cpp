// SPDX-License-Identifier: Apache-2.0
// A model is read in another process: the runtime was not written for hostile files.
#include "quarn/console/Log.h"
#include "quarn/console/interrupt.h"
#include "quarn/info/ModelReport.h"
#include "quarn/process/answerBytes.h"
#include "quarn/process/runApart.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <span>
#include <stdexcept>
#include <utility>

namespace quarn {
namespace {

// one list of members for both ways; `Answer` is const on the way out
template <class Archive, class Answer>
void transfer(Archive& archive, Answer& answer) {
    auto& model = answer.model;
    auto& metadata = model.metadata;
    archive(model.bytes), archive(model.inputs), archive(model.outputs), archive(model.hasShapes);
    archive(model.shapeCount), archive(model.shapeVertices), archive(model.problems);
    archive(model.shapeSource), archive(model.notes);
    archive(metadata.loaded), archive(metadata.deltaCount), archive(metadata.deltaMode);
    archive(metadata.smoothingIterations), archive(metadata.affectCount), archive(metadata.fullCount);
    archive(metadata.affectMap), archive(metadata.subsetState), archive(metadata.componentTagExpression);
    archive(metadata.geometry), archive(answer.printed), archive(answer.outputs);
}

// each row through the network as it is, for those who want to know whether it does what they trained
std::vector<float> outputsOf(neuralWarp::ModelSession& session, const ModelReport& model,
                             const storage::FloatTable& controls) {
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
// (decision 0120)
ModelAnswer answerOf(const std::filesystem::path& directory, const storage::FloatTable& controls) {
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

ModelAnswer readModelApart(const std::filesystem::path& directory, const storage::FloatTable& controls) {
    if (!std::filesystem::is_directory(directory))
        throw std::runtime_error(directory.string() + " is no model directory");
    Stage stage([&] { return "reading model " + directory.string() + " in a process apart"; });
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
    } catch (const DamagedAnswer&) {
        throw std::runtime_error(directory.string() + " is damaged: reading it crashes");
    } catch (const NoAnswer& none) {
        throw std::runtime_error(directory.string() + " is damaged: reading it " + none.what());
    } catch (const std::runtime_error&) {
        throwIfInterrupted(); // both processes have heard it
        throw;
    }
    answer.model.directory = directory;
    answer.model.knowledge = readKnowledge(directory); // our own readers, which the deformer's players use as well
    stage.result([&] { return std::to_string(answer.model.problems.size()) + " problems"; });
    return answer;
}

} // namespace quarn
