// SPDX-License-Identifier: Apache-2.0
#include "nw_model/ModelSession.h"

#include "OnnxScan.h"
#include "printLine.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <limits>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <system_error>

// The header asks the library for the newest function table it knows, which an older library refuses. We fetch the
// table ourselves and use nothing that is not in version 16 (decision 0020).
#define ORT_API_MANUAL_INIT
#include <onnxruntime_cxx_api.h>

namespace neuralWarp {
namespace {

constexpr std::uint32_t runtimeApiVersion = 16;

/// Newer runtimes collect what they run, keep it in the user's home and send it away, in every process that makes a
/// session, unless the environment says this before the first one. What the user has set stays.
void switchTelemetryOff() {
    ::setenv("ORT_DISABLE_TELEMETRY", "1", 0);
}

bool initialiseRuntimeApi() {
    switchTelemetryOff();
    const OrtApiBase* base = OrtGetApiBase();
    const OrtApi* api = base == nullptr ? nullptr : base->GetApi(runtimeApiVersion);
    if (api == nullptr) {
        return false;
    }
    Ort::InitApi(api);
    return true;
}

/// False when the runtime is too old. A local static, so that a session in another file's static object works too.
bool runtimeApiAvailable() {
    static const bool available = initialiseRuntimeApi();
    return available;
}

// The table is fetched when the library is loaded, on the thread that loads it and not in the middle of an evaluation:
// the environment must not change beside threads that may read it.
[[maybe_unused]] const bool fetchedAtLoad = runtimeApiAvailable();

const char* logIdentifier() {
    static const std::string identifier = "Neural Warp";
    return identifier.c_str();
}

/// Name and declared shape of input 0 or output 0.
struct TensorInfo {
    std::optional<Ort::AllocatedStringPtr> name;
    std::vector<std::int64_t> shape;
};

/// Product of the dimensions, or 0 when it is not a positive 32-bit signed number or a dimension is not known.
std::int32_t elementCount(const std::vector<std::int64_t>& shape) {
    constexpr std::int64_t limit = std::numeric_limits<std::int32_t>::max();
    std::int64_t count = 1;
    for (const std::int64_t dimension : shape) {
        if (dimension <= 0 || dimension > limit / count) {
            return 0;
        }
        count *= dimension;
    }
    return static_cast<std::int32_t>(count);
}

/// Declared shape of a tensor of at most `limit` values that callers can feed or read. Throws with the reason when they
/// cannot.
std::vector<std::int64_t> usableShape(const Ort::TypeInfo& type, const std::string& what, std::int32_t limit) {
    if (type.GetONNXType() != ONNX_TYPE_TENSOR) {
        throw std::runtime_error(what + " is not a tensor");
    }
    const Ort::ConstTensorTypeAndShapeInfo tensor = type.GetTensorTypeAndShapeInfo();
    if (tensor.GetElementType() != ONNX_TENSOR_ELEMENT_DATA_TYPE_FLOAT) {
        throw std::runtime_error(what + " is not float32");
    }
    std::vector<std::int64_t> shape = tensor.GetShape();
    if (shape.empty()) {
        // The runtime reports a scalar and a shape that the model does not declare in the same way (decision 0021).
        throw std::runtime_error(what + " is a scalar or has no declared shape");
    }
    const std::int32_t count = elementCount(shape);
    if (count == 0) {
        throw std::runtime_error(what + " has an unknown, zero or too large dimension");
    }
    if (count > limit) {
        throw std::runtime_error(what + " has " + std::to_string(count) + " values, and at most " +
                                 std::to_string(limit) + " are taken");
    }
    return shape;
}

TensorInfo readInput(const Ort::Session& session, OrtAllocator* allocator) {
    if (session.GetInputCount() != 1) {
        throw std::runtime_error("the model does not have exactly one input");
    }
    TensorInfo input;
    input.name = session.GetInputNameAllocated(0, allocator);
    input.shape = usableShape(session.GetInputTypeInfo(0), "the input", modelInputLimit);
    if (input.shape.size() != 1) {
        throw std::runtime_error("the input has more than one dimension");
    }
    return input;
}

TensorInfo readOutput(const Ort::Session& session, OrtAllocator* allocator, const char* inputName) {
    if (session.GetOutputCount() == 0) {
        throw std::runtime_error("the model has no output");
    }
    TensorInfo output;
    output.name = session.GetOutputNameAllocated(0, allocator);
    if (std::strcmp(output.name->get(), inputName) == 0) {
        // The runtime then reports success and leaves the caller's output array unwritten.
        throw std::runtime_error("the first output is the input itself");
    }
    output.shape = usableShape(session.GetOutputTypeInfo(0), "the first output", modelOutputLimit);
    return output;
}

/// From the last dot of the file name; unlike path::extension(), also when the name begins with that dot.
std::string extensionOf(const std::filesystem::path& path) {
    const std::string name = path.filename().string();
    const std::size_t dot = name.rfind('.');
    return dot == std::string::npos || name == "." || name == ".." ? std::string() : name.substr(dot);
}

ModelType typeOf(const std::filesystem::path& path) {
    const std::string extension = extensionOf(path);
    if (extension == ".pth" || extension == ".pt") {
        return ModelType::TorchType;
    }
    if (extension == ".onnx") {
        return ModelType::OnnxType;
    }
    return extension == ".h5" || extension.empty() ? ModelType::H5Type : ModelType::UnrecognizedType;
}

/// Throws unless the first `count` values are there and finite: all outputs, or none (decision 0022).
void checkInputs(std::span<const float> inputs, std::size_t count) {
    if (inputs.size() < count) {
        throw std::invalid_argument("fewer control values than the model takes");
    }
    inputs = inputs.first(count);
    if (!std::all_of(inputs.begin(), inputs.end(), [](float value) { return std::isfinite(value); })) {
        throw std::invalid_argument("a control value is not finite");
    }
}

void printUnsupportedType() {
    printLine("[NEURAL WARP] WARNING, unsupported ml model type\n");
}

/// An environment of the runtime. All of them stand for one object of the process, which the runtime takes down with
/// the last: it fails to make a new one while another thread is doing that, so the two take turns.
class Environment {
public:
    Environment() = default;
    ~Environment() {
        const std::scoped_lock lock(turn());
        env_.reset();
    }
    Environment(const Environment&) = delete;
    Environment& operator=(const Environment&) = delete;

    void renew() {
        const std::scoped_lock lock(turn());
        env_.emplace(ORT_LOGGING_LEVEL_WARNING, logIdentifier());
    }
    const Ort::Env& get() const { return *env_; }

private:
    static std::mutex& turn() {
        static std::mutex mutex;
        return mutex;
    }
    std::optional<Ort::Env> env_;
};

} // namespace

void checkModelOptionsVariable() {
    const char* given = std::getenv(modelOptionsVariable); // NOLINT(concurrency-mt-unsafe): as the header says
    const std::string value = given == nullptr ? "" : given;
    if (!value.empty() && value != "0" && value != "1")
        throw std::runtime_error(std::string("the environment variable ") + modelOptionsVariable + " is \"" + value +
                                 "\", and may only be 0 or 1");
}

/// What is held of ONNX Runtime. The names go before the allocator, the session before its environment.
struct ModelSession::Runtime {
    Environment env;
    std::optional<Ort::Session> session;
    std::optional<Ort::AllocatorWithDefaultOptions> allocator; // absent when the runtime is too old
    TensorInfo input;
    TensorInfo output;

    void build(const std::filesystem::path& path);
    std::vector<float> run(std::span<const float> inputs);
};

void ModelSession::Runtime::build(const std::filesystem::path& path) {
    if (!allocator) {
        throw std::runtime_error("ONNX Runtime is older than version 1.16");
    }
    scanOnnxFile(path);
    checkModelOptionsVariable();
    env.renew();
    Ort::SessionOptions options;
    options.SetGraphOptimizationLevel(ORT_ENABLE_ALL);
    Ort::Session fresh(env.get(), path.c_str(), options);
    TensorInfo freshInput = readInput(fresh, *allocator);
    output = readOutput(fresh, *allocator, freshInput.name->get());
    input = std::move(freshInput);
    session.emplace(std::move(fresh));
}

std::vector<float> ModelSession::Runtime::run(std::span<const float> inputs) {
    if (!session) {
        throw std::logic_error("no model is loaded");
    }
    const auto inputCount = static_cast<std::size_t>(elementCount(input.shape));
    const auto outputCount = static_cast<std::size_t>(elementCount(output.shape));
    checkInputs(inputs, inputCount);
    const auto memory = Ort::MemoryInfo::CreateCpu(OrtArenaAllocator, OrtMemTypeDefault);
    // The runtime takes tensors of either direction by mutable pointer, and only reads inputs.
    const Ort::Value inputTensor = Ort::Value::CreateTensor<float>(memory, const_cast<float*>(inputs.data()),
                                                                   inputCount, input.shape.data(), input.shape.size());
    std::vector<float> result(outputCount);
    Ort::Value outputTensor =
        Ort::Value::CreateTensor<float>(memory, result.data(), outputCount, output.shape.data(), output.shape.size());
    const char* const inputNames[] = {input.name->get()};
    const char* const outputNames[] = {output.name->get()};
    session->Run(Ort::RunOptions{nullptr}, inputNames, &inputTensor, 1, outputNames, &outputTensor, 1);
    return result;
}

ModelSession::ModelSession()
    : runtime_(std::make_unique<Runtime>()) {
    if (runtimeApiAvailable()) {
        runtime_->allocator.emplace();
    }
}

ModelSession::~ModelSession() = default;

LoadResult ModelSession::load(const std::filesystem::path& path, bool force) {
    if (!force && path == modelPath_) {
        return lastResult_;
    }
    lastResult_ = setModel(path);
    return lastResult_;
}

LoadResult ModelSession::setModel(const std::filesystem::path& path) {
    reset();
    errorText_.clear();
    modelPath_ = path;
    std::error_code error;
    const std::filesystem::file_status status = std::filesystem::status(path, error);
    if (status.type() == std::filesystem::file_type::not_found) {
        // any other failed query is no proof that nothing is there (decision 0023)
        return LoadResult::NotFound;
    }
    if (error) {
        reportLoadFailure(error.message().c_str());
        return LoadResult::NotLoaded;
    }
    return setFoundFile(std::filesystem::is_regular_file(status));
}

LoadResult ModelSession::setFoundFile(bool regularFile) {
    type_ = typeOf(modelPath_);
    if (type_ != ModelType::OnnxType) {
        return LoadResult::NotRecognized;
    }
    buildSession(regularFile);
    return LoadResult::Loaded;
}

void ModelSession::buildSession(bool regularFile) {
    runtime_->input = {};
    runtime_->output = {};
    try {
        if (!regularFile) {
            throw std::runtime_error("not a regular file"); // reading a pipe would wait for a writer
        }
        runtime_->build(modelPath_);
    } catch (const std::exception& error) {
        reportLoadFailure(error.what());
    } catch (...) {
        reportLoadFailure("unknown error");
    }
}

void ModelSession::reportLoadFailure(const char* reason) noexcept {
    printLine({"[NEURAL WARP] ERROR, Failed to load the ONNX model ", modelPath_.c_str(), "\n"});
    keepError(reason);
}

void ModelSession::keepError(const char* reason) noexcept {
    try {
        errorText_ = reason;
    } catch (const std::bad_alloc&) {
        errorText_ = "no memory"; // short enough to need none
    }
}

bool ModelSession::isLoaded() const {
    switch (type_) {
    case ModelType::UnrecognizedType:
        return false;
    case ModelType::OnnxType:
        return runtime_->session.has_value();
    default:
        return true;
    }
}

std::int32_t ModelSession::inputCount() const {
    if (type_ != ModelType::OnnxType) {
        printUnsupportedType();
        return 0;
    }
    // checked at load: one dimension that fits, or no shape at all when that load failed
    const std::vector<std::int64_t>& shape = runtime_->input.shape;
    return shape.empty() ? 0 : static_cast<std::int32_t>(shape.front());
}

std::vector<float> ModelSession::run(std::span<const float> inputs) noexcept {
    errorText_.clear();
    if (type_ != ModelType::OnnxType) {
        printUnsupportedType();
        return {};
    }
    try {
        return runtime_->run(inputs);
    } catch (const std::exception& error) {
        keepError(error.what());
    } catch (...) {
        keepError("unknown error");
    }
    return {};
}

void ModelSession::reset() noexcept {
    lastResult_ = LoadResult::NotLoaded;
    runtime_->session.reset();
}

} // namespace neuralWarp
