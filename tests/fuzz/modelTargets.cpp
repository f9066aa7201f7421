// SPDX-License-Identifier: Apache-2.0
#include "modelTargets.h"

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <fstream>
#include <optional>
#include <span>
#include <stdexcept>
#include <streambuf>
#include <string_view>
#include <vector>

#include <sys/mman.h>
#include <unistd.h>

#include "nw_model/ModelSession.h"
#include "nw_model/OnnxGraph.h"
#include "nw_model/PrincipalBasisFiles.h"
#include "readers.h"
#include "require.h"
#include "support/TemporaryFolder.h"

using namespace neuralWarp;

namespace {

class MemoryBuffer : public std::streambuf {
public:
    MemoryBuffer(const std::uint8_t* data, std::size_t size)
        : bytes_(data, data + size) { // a copy of exact size: the sanitizer sees a read past its end
        setg(bytes_.data(), bytes_.data(), bytes_.data() + bytes_.size());
    }

private:
    std::vector<char> bytes_;
};

/// Two shapes of one vertex, as the JSON of every archive has them.
constexpr std::string_view shapesText =
    "{\"principalShapeCount\": 2, \"principalVertCount\": 1, \"principalShapes\": [[1,2,3],[4,5,6]]}\n";

class CheckingSink final : public PrincipalShapesSink {
public:
    void begin(std::uint64_t shapeCount, std::uint64_t vertCount, std::span<const float> scales) override {
        require(shapeCount == 2 && vertCount == 1 && (scales.empty() || scales.size() == 2));
        count = 0;
    }
    void append(std::span<const float> values) override {
        count += values.size();
        require(std::all_of(values.begin(), values.end(), [](float value) { return std::isfinite(value); }));
    }
    void append(std::span<const std::uint16_t> halves) override {
        count += halves.size();
        require(std::all_of(halves.begin(), halves.end(), [](unsigned half) { return (half & 0x7C00U) != 0x7C00U; }));
    }

    std::size_t count = 0;
};

/// A file in memory under a path that ends in ".onnx".
class MemoryModelFile {
public:
    MemoryModelFile()
        : descriptor_(memfd_create("model", 0))
        , link_(folder_.path() / "model.onnx") {
        require(descriptor_ >= 0);
        std::filesystem::create_symlink("/proc/self/fd/" + std::to_string(descriptor_), link_);
    }
    ~MemoryModelFile() { close(descriptor_); }
    MemoryModelFile(const MemoryModelFile&) = delete;
    MemoryModelFile& operator=(const MemoryModelFile&) = delete;

    const std::filesystem::path& replaceBy(const std::uint8_t* data, std::size_t size) {
        require(ftruncate(descriptor_, 0) == 0);
        require(pwrite(descriptor_, data, size, 0) == static_cast<ssize_t>(size));
        return link_;
    }

private:
    TemporaryFolder folder_;
    int descriptor_;
    std::filesystem::path link_;
};

// what is taken from a certificate is finite, and as long as it says
void checkCertificate(std::string_view text) {
    try {
        const std::optional<ModelCertificate> certificate = certificateIn(text);
        if (!certificate)
            return;
        const ControlRanges& ranges = certificate->ranges;
        require(certificate->controlNames.size() == ranges.count());
        require(ranges.distance(std::vector<float>(ranges.count())) >= 0.0);
        require(certificate->expected.isEmpty() || std::isfinite(certificate->expected.at(0.5, 0.0)));
    } catch (const std::runtime_error&) {
        return; // refused
    }
}

// what is read of a network's graph is whole, and is of the network that the runtime has loaded
void checkGraph(const std::uint8_t* data, std::size_t size, const ModelSession& session) {
    try {
        MemoryBuffer source(data, size);
        const OnnxGraph graph = readOnnxGraph(source, size);
        require(!session.isLoaded() || graph.inputCount == static_cast<std::size_t>(session.inputCount()));
        std::size_t values = 0;
        for (const OnnxConstant& constant : graph.constants)
            values += constant.flaw.empty() ? constant.values.size() : 0;
        require(values <= size); // each takes four bytes at least
    } catch (const std::runtime_error&) {
        return; // refused
    }
}

} // namespace

bool fuzzMetadata(const std::uint8_t* data, std::size_t size) {
    MemoryBuffer source(data, size);
    ModelMetadata record;
    record.fullCount = 123456789;
    const bool accepted = readMetadata(record, source, "metadata");
    require(record.loaded == accepted);
    require(accepted || record.fullCount == 123456789);
    require(record.affectMap.size() <= size); // an index takes a byte at least
    checkCertificate({reinterpret_cast<const char*>(data), size});
    return accepted;
}

bool fuzzPrincipalShapes(const std::uint8_t* data, std::size_t size) {
    MemoryBuffer source(data, size);
    PrincipalShapes shapes;
    const bool accepted = readPrincipalShapes(shapes, source, "shapes");
    require(accepted || (shapes.shapeCount == 0 && shapes.values.empty()));
    require(!accepted || shapes.values.size() == 3 * shapes.shapeCount * shapes.vertCount);
    require(shapes.values.capacity() <= size);
    require(std::all_of(shapes.values.begin(), shapes.values.end(), [](float value) { return std::isfinite(value); }));
    return accepted;
}

bool fuzzShapesArchive(const std::uint8_t* data, std::size_t size) {
    static const TemporaryFolder folder;
    const auto write = [](const char* name, const char* bytes, std::size_t count) {
        std::ofstream(folder.path() / name, std::ios::binary).write(bytes, static_cast<std::streamsize>(count));
    };
    write("principal_shapes.json", shapesText.data(), shapesText.size());
    write("principal_shapes.npz", reinterpret_cast<const char*>(data), size);
    CheckingSink sink;
    PrincipalShapesAnswer answer;
    require(readPrincipalBasis(folder.path(), sink, answer)); // the JSON is sound
    require(sink.count == 6 && answer.shapeCount == 2 && answer.vertCount == 1);
    require(answer.isFromArchive == answer.whyNotArchive.empty());
    return answer.isFromArchive;
}

bool fuzzOnnxLoad(const std::uint8_t* data, std::size_t size) {
    static MemoryModelFile file;
    ModelSession session;
    require(session.load(file.replaceBy(data, size), true) == LoadResult::Loaded);
    const bool accepted = session.isLoaded();
    require(accepted == (session.inputCount() > 0));
    require(accepted == session.errorText().empty());
    // a model of a few bytes can declare billions of control values: feed it no more than could be real
    const auto inputCount = static_cast<std::size_t>(std::min(session.inputCount(), 65536));
    const std::vector<float> outputs = session.run(std::vector<float>(inputCount));
    require(outputs.empty() == !session.errorText().empty());
    require(accepted || outputs.empty());
    checkGraph(data, size, session);
    return accepted;
}
