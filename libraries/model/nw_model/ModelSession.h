// SPDX-License-Identifier: Apache-2.0
// neuralWarp model runtime: one network file, loaded and run.
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace neuralWarp {

/// What the last load of a ModelSession came to.
enum class LoadResult : std::int32_t {
    Loaded = 0,        ///< An ONNX file was found and a session build was tried: ask isLoaded() whether it succeeded.
    NotFound = 1,      ///< No file at the path.
    NotRecognized = 2, ///< The file exists but is not an ONNX file by its extension.
    NotLoaded = 3,     ///< No load has completed since construction or the last reset.
};

/// Model file type, told by the file extension alone. Only OnnxType can be run.
enum class ModelType : std::int32_t {
    UnrecognizedType = 0, ///< Any other extension.
    H5Type = 1,           ///< ".h5", or no extension.
    TorchType = 2,        ///< ".pth" or ".pt".
    OnnxType = 3,         ///< ".onnx".
};

/// Most control values that a model may take, and most values that it may give: those of a mesh of 44 million vertices.
/// A file of a hundred bytes can declare any number, and the arrays are sized by it.
inline constexpr std::int32_t modelInputLimit = std::int32_t{1} << 20;
inline constexpr std::int32_t modelOutputLimit = std::int32_t{1} << 27;

/// The variable of the environment that says whether the runtime takes numbers of threads from the metadata entry
/// "ort_config" of a network: "1", or "0" as without the variable. It counts at the load of each model (decision 0060).
inline constexpr const char* modelOptionsVariable = "ORT_LOAD_CONFIG_FROM_MODEL";

/// Throws std::runtime_error, which names the variable and its value, when that is neither "0" nor "1" nor empty: no
/// model can be loaded then. Thread: any, while no other changes the environment.
void checkModelOptionsVariable();

/// Loads one trained network and runs it on a vector of control values, on the CPU.
///
/// A model can be run when it has exactly one input, float32 of shape [N] with N > 0, and at least one output, the
/// first of which is float32 with a fully known shape of one or more dimensions, all positive; the element counts must
/// be within the two limits above. Further outputs are not computed. Any other model is refused at load, and so is one
/// whose first output is its input itself, which computes nothing. A scalar output is refused because the runtime
/// reports an output without a declared shape in the same way. Refused as well, before the runtime sees them: a network
/// whose data lie in other files, one with a Loop that may make more than ten thousand rounds or any number, and one
/// whose "ort_config" asks for anything but 1 to as many threads as the machine has cores.
///
/// Thread: one thread at a time for one object; different objects are independent.
class ModelSession {
public:
    /// Obtains the runtime's default allocator. Throws the runtime's exception (a std::exception) when that fails. A
    /// runtime that is too old for this build is no failure here: every ONNX load then fails as a bad file does.
    ModelSession();
    ~ModelSession();
    ModelSession(const ModelSession&) = delete;
    ModelSession& operator=(const ModelSession&) = delete;

    /// Loads the model file at `path`, replacing what was loaded: after a failed load nothing is left that could run.
    ///
    /// `path`  file to load, its bytes passed to the operating system as they are; copied.
    /// `force` false: a path equal to modelPath() answers with lastResult() and touches neither disk nor runtime.
    ///
    /// The file type is the part of the file name from its last dot, case-sensitive (so ".onnx" alone is an ONNX
    /// file; "." and ".." have no extension). A path below something that is not a directory is NotFound. When the
    /// file system cannot say whether the file exists (a loop of links, a name that is too long, a directory that may
    /// not be searched), the result is NotLoaded and type() stays. That, and an ONNX file that gives no session
    /// (damaged, refused as above, or not a regular file; or any, as checkModelOptionsVariable() says), prints
    /// "[NEURAL WARP] ERROR, Failed to load the ONNX model PATH\n" on standard output and leaves the reason in
    /// errorText().
    ///
    /// Throws only std::bad_alloc, when there is no memory to keep the path.
    LoadResult load(const std::filesystem::path& path, bool force);

    /// False when type() is 0, and when it is OnnxType without a session; true otherwise. A file type that can only be
    /// recognised (Torch, H5) therefore counts as loaded, although it cannot be run.
    bool isLoaded() const;

    /// Number of control values the model takes: the first dimension of its input; 0 when the last session build
    /// failed. Types other than OnnxType print "[NEURAL WARP] WARNING, unsupported ml model type\n" on standard output
    /// and give 0.
    std::int32_t inputCount() const;

    /// Runs the model on control values.
    ///
    /// `inputs` at least inputCount() values, wrapped and not copied; further values are ignored. Not retained.
    ///
    /// Returns the values of the first output in row-major order, as many as its declared shape holds; empty when
    /// there is nothing to return: no session, too few inputs, a NaN or infinite input, a runtime failure or no
    /// memory; errorText() says which. Never throws. A non-finite control value is refused because the network would
    /// spread it over every vertex: without a result the caller leaves the mesh as the rig made it, and the frame is
    /// kept. Output values are passed on as the network computed them. Types other than OnnxType print the warning of
    /// inputCount().
    std::vector<float> run(std::span<const float> inputs) noexcept;

    /// Releases the session; lastResult() becomes NotLoaded. Type and shapes stay, so inputCount() does.
    void reset() noexcept;

    /// Result of the last load; NotLoaded at first.
    LoadResult lastResult() const { return lastResult_; }

    /// Path of the last load, whatever came of it; empty at first.
    const std::filesystem::path& modelPath() const { return modelPath_; }

    /// Type of the last file that was found; a load that finds no file does not change it.
    ModelType type() const { return type_; }

    /// Why the last load gave no session, or the last run since then no values: one or more lines of text, in part the
    /// runtime's own. Empty after a success, and where result or type say it all (NotFound, NotRecognized).
    const std::string& errorText() const { return errorText_; }

private:
    struct Runtime; // keeps the runtime's headers, and its function table, out of every includer

    LoadResult setModel(const std::filesystem::path& path);
    LoadResult setFoundFile(bool regularFile);
    void buildSession(bool regularFile);
    void reportLoadFailure(const char* reason) noexcept;
    void keepError(const char* reason) noexcept;

    LoadResult lastResult_ = LoadResult::NotLoaded;
    std::filesystem::path modelPath_;
    ModelType type_ = ModelType::UnrecognizedType;
    std::unique_ptr<Runtime> runtime_;
    std::string errorText_;
};

} // namespace neuralWarp
