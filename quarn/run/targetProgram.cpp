// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/targetProgram.h"

#include "quarn/console/json.h"
#include "quarn/process/runProgram.h"
#include "storage/Folder.h"
#include "storage/NpyFile.h"
#include "storage/NpyWriter.h"
#include "storage/WholeFile.h"
#include "storage/finite.h"

#include <algorithm>

namespace quarn {
namespace {

namespace fs = std::filesystem;

void writeSkin(JsonWriter& writer, const TargetRequest& request, const fs::path& folder) {
    writer.Key("skin");
    writer.StartObject();
    writeText(writer, "file", (folder / request.skin).string());
    writeText(writer, "format", "npy <f4");
    writer.Key("shape");
    writer.StartArray();
    for (const std::size_t size : {request.frames(), request.vertices, std::size_t{3}})
        writer.Uint64(size);
    writer.EndArray();
    writer.Key("firstFrame");
    writer.Int(request.firstFrame);
    writer.Key("metersPerUnit");
    writer.Double(request.metersPerUnit);
    writeText(writer, "axes", "as in the character's file");
    writeText(writer, "order", request.order);
    writeText(writer, "rest", (folder / request.rest).string());
    writer.EndObject();
}

/// An array of frames as a target program has to write it.
class Answer {
public:
    Answer(const fs::path& path, std::size_t frames, std::size_t vertices)
        : file_(path.string()) {
        const auto shape = [](std::size_t a, std::size_t b) {
            return "[" + std::to_string(a) + ", " + std::to_string(b) + ", 3]";
        };
        if (file_.frameCount() != frames || file_.vertexCount() != vertices)
            throw std::runtime_error("wrote an array of " + shape(file_.frameCount(), file_.vertexCount()) +
                                     ", and was asked for " + shape(frames, vertices));
    }

    std::vector<float> frame(std::size_t index) const {
        std::vector<double> xyz(3 * file_.vertexCount());
        file_.read(index, 0, xyz);
        return {xyz.begin(), xyz.end()};
    }
    /// `firstFrame` is that of the first row, for the sentence.
    void requireFinite(int firstFrame) const {
        for (std::size_t row = 0; row < file_.frameCount(); ++row)
            if (const auto place = storage::firstNotFinite(frame(row)))
                throw std::runtime_error("wrote a coordinate that is no finite number, of vertex " +
                                         std::to_string(*place / 3) + " in frame " +
                                         std::to_string(firstFrame + static_cast<int>(row)));
    }

private:
    storage::NpyFile file_;
};

/// A folder that nobody else uses, empty at its begin and gone at its end.
class Scratch {
public:
    explicit Scratch(const fs::path& folder)
        : path_(folder / "scratch") {
        fs::remove_all(path_); // of a run that was killed
        storage::makeFolders(path_, path_);
    }
    ~Scratch() {
        std::error_code error;
        fs::remove_all(path_, error);
    }
    Scratch(const Scratch&) = delete;
    Scratch& operator=(const Scratch&) = delete;
    const fs::path& path() const { return path_; }

private:
    fs::path path_;
};

/// The frames of a request, in parts that stay when the run ends in the middle.
class Parts {
public:
    Parts(const Step& step, const TargetPlace& place)
        : step_(step)
        , request_(*step.request)
        , place_(place)
        , output_(place.folder / step.outputs.front())
        , folder_(output_.string() + ".parts-" + place.digest)
        , size_(request_.part > 0 ? static_cast<std::size_t>(request_.part) : request_.frames()) {}

    void run() {
        removeOthers();
        storage::makeFolders(folder_, folder_);
        for (std::size_t first = 0; first < request_.frames(); first += size_)
            if (!isThere(first))
                ask(first);
        join();
        fs::remove_all(folder_);
    }

private:
    std::size_t count(std::size_t first) const { return std::min(size_, request_.frames() - first); }
    int frame(std::size_t row) const { return request_.firstFrame + static_cast<int>(row); }
    fs::path part(std::size_t first) const { return folder_ / (std::to_string(frame(first)) + ".npy"); }

    void removeOthers() const {
        const std::string begin = output_.filename().string() + ".parts-";
        std::error_code error;
        std::vector<fs::path> others;
        for (const fs::directory_entry& entry : fs::directory_iterator(output_.parent_path(), error))
            if (entry.path().filename().string().rfind(begin, 0) == 0 && entry.path() != folder_)
                others.push_back(entry.path());
        for (const fs::path& other : others)
            fs::remove_all(other, error);
    }

    bool isThere(std::size_t first) const {
        try {
            Answer(part(first), count(first), request_.vertices).requireFinite(frame(first));
            return true;
        } catch (const std::exception&) {
            return false; // or damaged: to be asked for again
        }
    }

    void ask(std::size_t first) const {
        const Scratch scratch(place_.folder);
        const fs::path question = scratch.path() / "request.json";
        const fs::path answer = scratch.path() / "targets.npy";
        storage::writeWhole(question, textOf(request_, place_.folder, frame(first), count(first), answer));
        ProgramCall call;
        call.words = step_.words;
        call.words.push_back(question.string());
        call.folder = scratch.path();
        call.log = place_.log;
        call.grace = place_.grace;
        if (request_.timeout > 0)
            call.timeout = std::chrono::seconds(request_.timeout);
        runProgram(call, place_.meanwhile).require();
        take(answer, first);
    }

    void take(const fs::path& answer, std::size_t first) const {
        std::error_code error;
        if (!fs::is_regular_file(fs::symlink_status(answer, error)))
            throw std::runtime_error("ended with status 0, and has not written the file that it was asked for");
        Answer(answer, count(first), request_.vertices).requireFinite(frame(first));
        storage::syncToDisk(answer);
        storage::moveFolder(answer, part(first));
    }

    void join() const {
        if (size_ >= request_.frames() && request_.known.empty())
            return storage::moveFolder(part(0), output_);
        storage::NpyWriter writer(output_.string(), request_.vertices);
        if (!request_.known.empty())
            appendKnown(writer);
        for (std::size_t first = 0; first < request_.frames(); first += size_) {
            const Answer answer(part(first), count(first), request_.vertices);
            for (std::size_t row = 0; row < count(first); ++row)
                writer.append(answer.frame(row));
        }
        writer.finish();
    }

    void appendKnown(storage::NpyWriter& writer) const {
        const fs::path file = place_.folder / request_.known;
        const std::size_t frames = storage::NpyFile(file.string()).frameCount();
        const Answer known(file, frames, request_.vertices);
        for (std::size_t row = 0; row < frames; ++row)
            writer.append(known.frame(row));
    }

    const Step& step_;
    const TargetRequest& request_;
    const TargetPlace& place_;
    fs::path output_, folder_;
    std::size_t size_;
};

} // namespace

std::string textOf(const TargetRequest& request, const fs::path& folder, int first, std::size_t frames,
                   const fs::path& output) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "format", "neuralWarp target request");
    writeCount(writer, "version", 1);
    writeText(writer, "mesh", request.mesh);
    writeText(writer, "character", request.character.string());
    writer.Key("skeleton");
    writer.StartObject();
    writeText(writer, "file", (folder / request.skeleton).string());
    writeText(writer, "format", "glb");
    writer.EndObject();
    writeText(writer, "scene", (folder / request.scene).string());
    writeSkin(writer, request, folder);
    writer.Key("frames");
    writer.StartArray();
    for (std::size_t i = 0; i < frames; ++i)
        writer.Int(first + static_cast<int>(i));
    writer.EndArray();
    writeText(writer, "write", output.string());
    writer.EndObject();
    return std::string(buffer.GetString()) + "\n";
}

void runTargetProgram(const Step& step, const TargetPlace& place) {
    try {
        Parts(step, place).run();
    } catch (const TimedOut& late) {
        throw std::runtime_error(std::string(late.what()) + ", and was ended");
    }
}

} // namespace quarn
