// SPDX-License-Identifier: Apache-2.0
#include "kinds.h"
#include "values.h"

#include "nw_model/ModelMetadata.h"
#include "nw_model/PrincipalShapes.h"
#include "support/StdoutCapture.h"
#include "support/TemporaryFolder.h"

#include <fstream>
#include <stdexcept>

namespace replay {
namespace {

std::filesystem::path writeFile(const TemporaryFolder& folder, const std::string& text) {
    auto path = folder.path() / "case.json";
    std::ofstream stream(path, std::ios::binary);
    if (!stream.write(text.data(), static_cast<std::streamsize>(text.size())).flush())
        throw std::runtime_error(path.string() + " cannot be written");
    return path;
}

Json recordToJson(const neuralWarp::ModelMetadata& record, JsonAllocator& allocator) {
    Output out(allocator);
    out.set("loaded", record.loaded);
    out.set("deltaCount", record.deltaCount);
    out.set("deltaMode", record.deltaMode);
    out.set("smoothingIterations", record.smoothingIterations);
    out.set("affectCount", record.affectCount);
    out.set("fullCount", record.fullCount);
    out.set("affectMap", record.affectMap);
    out.set("subsetState", static_cast<std::uint32_t>(record.subsetState));
    out.set("componentTagExpression", record.componentTagExpression);
    out.set("geometry", record.geometry);
    return out.take();
}

} // namespace

Json replayMetadata(Input& input, JsonAllocator& allocator) {
    const TemporaryFolder folder;
    const auto path = writeFile(folder, readText(input["text"]));
    neuralWarp::ModelMetadata record;
    StdoutCapture capture;
    const bool ok = neuralWarp::readMetadataFile(record, path);
    const std::string printed = capture.take();

    Output out(allocator);
    out.set("ok", ok);
    out.set("record", recordToJson(record, allocator));
    out.set("stdout", linesOf(printed));
    return out.take();
}

Json replayPrincipal(Input& input, JsonAllocator& allocator) {
    const TemporaryFolder folder;
    const auto path = writeFile(folder, readText(input["text"]));
    std::vector<float> values;
    std::uint64_t shapeCount = 0, vertCount = 0;
    StdoutCapture capture;
    const bool ok = neuralWarp::readPrincipalShapesFile(path, values, shapeCount, vertCount);
    const std::string printed = capture.take();

    Output out(allocator);
    out.set("ok", ok);
    out.set("S", static_cast<std::uint32_t>(shapeCount));
    out.set("V", static_cast<std::uint32_t>(vertCount));
    out.set("values", values);
    out.set("stdout", linesOf(printed));
    return out.take();
}

} // namespace replay
