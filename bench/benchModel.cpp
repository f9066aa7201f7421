// SPDX-License-Identifier: Apache-2.0
// bench_model: the model runtime beside its yardsticks: the bare runtime for loading and running, and a loop of
// std::from_chars over the file's text for the readers. In the table a "vertex" is one run, one load or one number of
// the file.
#include "harness.h"
#include "options.h"
#include "secondCore.h"

#include "frame/PrincipalBasis.h"
#include "nw_model/ModelMetadata.h"
#include "nw_model/ModelSession.h"
#include "nw_model/PrincipalBasisFiles.h"
#include "nw_model/PrincipalShapes.h"
#include "storage/byteOrder.h"
#include "storage/fileSum.h"
#include "support/TemporaryFolder.h"
#include "support/npzBytes.h"

#include <charconv>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <span>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#define ORT_API_MANUAL_INIT
#include <onnxruntime_cxx_api.h>

namespace {

using bench::Phase;
namespace fs = std::filesystem;

fs::path testModel(const std::string& name) {
    return fs::path(NW_TEST_MODELS) / (name + ".onnx");
}

// A network run without ModelSession: tensors are wrapped once and written again by every run.
class BareNetwork {
public:
    explicit BareNetwork(const fs::path& path)
        : session_(env_, path.c_str(), options_)
        , inputName_(session_.GetInputNameAllocated(0, Ort::AllocatorWithDefaultOptions()))
        , outputName_(session_.GetOutputNameAllocated(0, Ort::AllocatorWithDefaultOptions()))
        , input_(wrap(inputs_, session_.GetInputTypeInfo(0)))
        , output_(wrap(outputs_, session_.GetOutputTypeInfo(0))) {}

    std::size_t inputCount() const { return inputs_.size(); }
    void run() {
        const char* const inputNames[] = {inputName_.get()};
        const char* const outputNames[] = {outputName_.get()};
        session_.Run(Ort::RunOptions{nullptr}, inputNames, &input_, 1, outputNames, &output_, 1);
    }

private:
    static Ort::Value wrap(std::vector<float>& values, const Ort::TypeInfo& type) {
        const std::vector<std::int64_t> shape = type.GetTensorTypeAndShapeInfo().GetShape();
        std::size_t count = 1;
        for (const std::int64_t dimension : shape)
            count *= static_cast<std::size_t>(dimension);
        values.assign(count, 1.0F);
        const auto memory = Ort::MemoryInfo::CreateCpu(OrtArenaAllocator, OrtMemTypeDefault);
        return Ort::Value::CreateTensor<float>(memory, values.data(), count, shape.data(), shape.size());
    }

    Ort::Env env_{ORT_LOGGING_LEVEL_WARNING, "bench_model"};
    Ort::SessionOptions options_;
    Ort::Session session_;
    Ort::AllocatedStringPtr inputName_, outputName_;
    std::vector<float> inputs_, outputs_;
    Ort::Value input_, output_;
};

Phase running(const std::string& model, neuralWarp::ModelSession& session, BareNetwork& bare) {
    session.load(testModel(model), true);
    const std::vector<float> inputs(bare.inputCount(), 1.0F);
    Phase phase{"run", model, 1};
    phase.ours = [&session, inputs] {
        if (session.run(inputs).empty())
            throw std::runtime_error(session.errorText());
    };
    phase.plain = [&bare] { bare.run(); };
    return phase;
}

// What any reader must do: fetch the text and convert every number in it.
template <typename Number, typename Stored>
void convertNumbers(const fs::path& path, std::vector<Stored>& values) {
    std::ifstream file(path, std::ios::binary);
    const std::string text(std::istreambuf_iterator<char>(file), {});
    values.clear();
    const char* at = text.data() + text.find('[');
    for (const char* end = text.data() + text.size(); at != end;) {
        Number number{};
        const auto [next, error] = std::from_chars(at, end, number);
        if (error == std::errc())
            values.push_back(static_cast<Stored>(number));
        at = error == std::errc() ? next : at + 1;
    }
}

std::string shapesText(std::size_t shapes, std::size_t vertices) {
    std::string text = "{\"principalShapeCount\": " + std::to_string(shapes) +
                       ", \"principalVertCount\": " + std::to_string(vertices) + ", \"principalShapes\": [";
    double value = 0.1234567890123456;
    for (std::size_t s = 0; s < shapes; ++s) {
        text += s == 0 ? "[" : "], [";
        for (std::size_t i = 0; i < 3 * vertices; ++i) {
            char number[32];
            value = value * 3.9 * (1.0 - value); // spreads over ]0, 1[ with all its digits
            std::snprintf(number, sizeof number, "%s%.17g", i == 0 ? "" : ", ", value - 0.5);
            text += number;
        }
    }
    return text + "]]}";
}

fs::path write(const fs::path& path, const std::string& text) {
    std::ofstream(path, std::ios::binary) << text;
    return path;
}

// Shapes as the trainer writes them: nine digits a number, and the archive beside the text.
void writeShapes(const fs::path& folder, std::size_t shapes, std::size_t vertices) {
    std::vector<float> values(3 * shapes * vertices);
    std::string text = "{\"principalShapeCount\": " + std::to_string(shapes) +
                       ", \"principalVertCount\": " + std::to_string(vertices) + ", \"principalShapes\": [\n";
    double value = 0.1234567890123456;
    for (std::size_t s = 0; s < shapes; ++s) {
        text += s == 0 ? "[" : ",\n[";
        for (std::size_t i = 0; i < 3 * vertices; ++i) {
            char number[32];
            value = value * 3.9 * (1.0 - value);
            float& stored = values[3 * (i / 3 * shapes + s) + i % 3];
            stored = static_cast<float>(0.01 * (value - 0.5));
            std::snprintf(number, sizeof number, "%s%.9g", i == 0 ? "" : ",", static_cast<double>(stored));
            text += number;
        }
        text += "]";
    }
    const fs::path json = write(folder / "principal_shapes.json", text + "\n]}\n");
    write(folder / "principal_shapes.npz",
          shapesArchive(storage::sumOfFile(json, UINT64_MAX, 0).digits, values, shapes));
}

// The archive that a budget makes, beside the same text, which is not compared: small numbers mostly, of five bits or
// so, and a tenth of the shapes in two bytes.
void writeWholeNumbers(const fs::path& folder, const fs::path& json, std::size_t shapes, std::size_t vertices) {
    std::string large, small;
    double value = 0.1234567890123456;
    for (std::size_t i = 0; i < 3 * shapes * vertices; ++i) {
        value = value * 3.9 * (1.0 - value);
        const double part = 2 * (value - 0.5);
        if (i / 3 % shapes < shapes / 10)
            storage::putLittle(large, static_cast<std::int16_t>(2000 * part * part * part));
        else
            small += static_cast<char>(127 * part * part * part);
    }
    std::string scales;
    for (std::size_t s = 0; s < shapes; ++s)
        storage::putLittle(scales, 0.001F);
    fs::create_directory(folder);
    fs::copy_file(json, folder / "principal_shapes.json");
    const std::string digits = storage::sumOfFile(json, UINT64_MAX, 0).digits;
    write(folder / "principal_shapes.npz",
          npzBytes({{"json_xxh3_128", npyBytes("|S32", {}, digits)},
                    {"shapes_int16", npyBytes("<i2", {vertices, shapes / 10, 3}, large)},
                    {"shapes_int8", npyBytes("|i1", {vertices, shapes - shapes / 10, 3}, small)},
                    {"scales", npyBytes("<f4", {shapes}, scales)}},
                   true));
}

class BasisSink final : public neuralWarp::PrincipalShapesSink {
public:
    void begin(std::uint64_t shapeCount, std::uint64_t vertCount, std::span<const float> scales) override {
        if (scales.empty())
            basis_.resize(vertCount, shapeCount);
        else
            basis_.resizeHalves(vertCount, scales);
        filled_ = 0;
    }
    void append(std::span<const float> values) override { put(values); }
    void append(std::span<const std::uint16_t> halves) override { put(halves); }

private:
    template <class Number>
    void put(std::span<const Number> values) {
        basis_.set(filled_, values);
        filled_ += values.size() / 3 / basis_.shapeCount();
    }

    neuralWarp::PrincipalBasis basis_;
    std::size_t filled_ = 0;
};

// From the files of a model to the basis that frames read, and the parts of that way.
std::vector<Phase> openingShapes(const fs::path& folder, std::size_t vertices, const std::string& name) {
    constexpr std::size_t shapes = 50;
    fs::create_directory(folder);
    writeShapes(folder, shapes, vertices);
    const fs::path json = folder / "principal_shapes.json";
    const std::size_t numbers = 3 * shapes * vertices;
    const auto open = [](const fs::path& from) {
        BasisSink sink;
        neuralWarp::PrincipalShapesAnswer answer;
        if (!neuralWarp::readPrincipalBasis(from, sink, answer) || !answer.isFromArchive)
            throw std::runtime_error("the shapes cannot be opened: " + answer.whyNotArchive);
    };
    Phase all{"open shapes", name, numbers, fs::file_size(json)};
    all.ours = [open, folder] { open(folder); };
    const fs::path ofBudget = folder / "budget";
    writeWholeNumbers(ofBudget, json, shapes, vertices);
    Phase wholes{"open shapes: whole numbers", name, numbers, fs::file_size(ofBudget / "principal_shapes.npz")};
    wholes.ours = [open, ofBudget] { open(ofBudget); };
    Phase sum{"open shapes: sum of text", name, numbers, fs::file_size(json)};
    sum.ours = [json] { storage::sumOfFile(json, UINT64_MAX, 0); };
    Phase text{"open shapes: by text", name, numbers, fs::file_size(json)};
    text.ours = [json] {
        std::vector<float> values;
        std::uint64_t counts[2];
        neuralWarp::readPrincipalShapesFile(json, values, counts[0], counts[1]);
    };
    Phase layOut{"open shapes: lay out", name, numbers, numbers * sizeof(float)};
    layOut.ours = [values = std::vector<float>(numbers)] { neuralWarp::PrincipalBasis().assign(values, shapes); };
    return {all, wholes, sum, layOut, text};
}

// The sum that a frame makes, of halves held against that of floats.
Phase summing(std::size_t vertices, const std::string& name) {
    constexpr std::size_t shapes = 50;
    neuralWarp::PrincipalBasis floats, halves;
    floats.assign(std::vector<float>(3 * shapes * vertices, 0.25F), shapes);
    halves.resizeHalves(vertices, std::vector<float>(shapes, 1.0F));
    halves.set(0, std::span<const std::uint16_t>(std::vector<std::uint16_t>(3 * shapes * vertices, 0x3400)));
    auto sum = [sums = std::vector<quill::val3<float>>(vertices),
                coefficients = std::vector<float>(shapes, 0.5F)](const neuralWarp::PrincipalBasis& basis) mutable {
        basis.sum(sums.data(), coefficients.data(), 0, basis.blockCount());
    };
    const std::size_t numbers = 3 * shapes * vertices;
    Phase phase{"sum shapes: halves", name, numbers, numbers * sizeof(std::uint16_t)};
    // shared: a copy would not lie in large pages
    phase.ours = [sum, basis = std::make_shared<const neuralWarp::PrincipalBasis>(std::move(halves))]() mutable {
        sum(*basis);
    };
    phase.plain = [sum, basis = std::make_shared<const neuralWarp::PrincipalBasis>(std::move(floats))]() mutable {
        sum(*basis);
    };
    return phase;
}

std::string metadataText(std::size_t indices) {
    std::string text = "{\"subsetState\": \"partial\", \"affectMap\": [0";
    for (std::size_t i = 1; i < indices; ++i)
        text += ", " + std::to_string(7 * i);
    return text + "]}";
}

Phase readingShapes(const fs::path& folder, std::vector<float>& values, std::vector<float>& plainValues) {
    constexpr std::size_t shapes = 50, vertices = 4000;
    const fs::path path = write(folder / "principal_shapes.json", shapesText(shapes, vertices));
    Phase phase{"read shapes", "50 shapes", 3 * shapes * vertices, fs::file_size(path)};
    phase.ours = [path, &values] {
        std::uint64_t counts[2];
        if (!neuralWarp::readPrincipalShapesFile(path, values, counts[0], counts[1]))
            throw std::runtime_error("the shapes cannot be read");
    };
    phase.plain = [path, &plainValues] { convertNumbers<double>(path, plainValues); };
    return phase;
}

Phase readingMetadata(const fs::path& folder, neuralWarp::ModelMetadata& record, std::vector<std::uint32_t>& plain) {
    constexpr std::size_t indices = 100000;
    const fs::path path = write(folder / "metadata.json", metadataText(indices));
    Phase phase{"read metadata", "affectMap", indices, fs::file_size(path)};
    phase.ours = [path, &record] {
        if (!neuralWarp::readMetadataFile(record, path))
            throw std::runtime_error("the metadata cannot be read");
    };
    phase.plain = [path, &plain] { convertNumbers<std::uint32_t>(path, plain); };
    return phase;
}

void runAll(const bench::Options& options, bench::Report& report) {
    const TemporaryFolder folder;
    neuralWarp::ModelSession direct, wide;
    BareNetwork bareDirect(testModel("direct")), bareWide(testModel("wide"));
    std::vector<float> values, plainValues;
    neuralWarp::ModelMetadata record;
    std::vector<std::uint32_t> plainIndices;
    const std::size_t vertices = options.isQuick ? 10000 : 100000;
    const std::string name = options.isQuick ? "10 k x 50" : "100 k x 50";
    std::vector<Phase> phases = {
        running("direct", direct, bareDirect),
        running("wide", wide, bareWide),
        readingShapes(folder.path(), values, plainValues),
        readingMetadata(folder.path(), record, plainIndices),
    };
    phases.push_back(summing(vertices, name));
    for (const Phase& phase :
         options.wants("open shapes") ? openingShapes(folder.path() / "opened", vertices, name) : std::vector<Phase>())
        phases.push_back(phase);
    for (Phase& phase : phases) {
        phase.parallel = false;
        if (phase.name.rfind(options.only, 0) == 0)
            report.add(bench::measure(phase, 1, options.seconds));
    }
}

} // namespace

int main(int argc, char** argv) {
    const auto options = bench::readOptions(argc, argv);
    if (!options)
        return 2;
    try {
        ::setenv(neuralWarp::modelOptionsVariable, "1", 0); // as quarn does
        const OrtApi* api = OrtGetApiBase()->GetApi(16);
        if (!api)
            throw std::runtime_error("ONNX Runtime is too old");
        Ort::InitApi(api);
        bench::Report report(options->csv.get());
        report.header();
        runAll(*options, report);
        bench::Report::legend("the bare runtime, or a loop that only converts a file's numbers");
        if (options->wants("second core"))
            bench::measureSecondCore(*options);
        std::printf("CSV: %s\n", options->csvPath.c_str());
        return 0;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "bench_model: %s\n", error.what());
        return 1;
    }
}
