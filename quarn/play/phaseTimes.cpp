// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/phaseTimes.h"

#include "openquarn_app/Profiling.h"
#include "storage/WholeFile.h"

#include <rapidjson/istreamwrapper.h>
#include <rapidjson/reader.h>

#include <fstream>
#include <stdexcept>

namespace quarn {
namespace {

constexpr double secondsInMicrosecond = 1e-6;

// takes name, category and duration of each event as they come by: a trace may be too large for a document
class PhaseReader : public rapidjson::BaseReaderHandler<rapidjson::UTF8<>, PhaseReader> {
public:
    std::map<std::string, std::vector<double>> phases;

    bool Key(const char* text, rapidjson::SizeType length, bool) {
        key_.assign(text, length);
        return true;
    }
    bool String(const char* text, rapidjson::SizeType length, bool) {
        if (key_ == "name" && depth_ == eventDepth)
            name_.assign(text, length);
        else if (key_ == "cat" && depth_ == eventDepth)
            category_.assign(text, length);
        return true;
    }
    bool Double(double number) { return duration(number); }
    bool Int(int number) { return duration(number); }
    bool Uint(unsigned number) { return duration(number); }
    bool StartObject() {
        if (++depth_ == eventDepth) {
            name_.clear();
            category_.clear();
            duration_ = -1.0;
        }
        return true;
    }
    bool EndObject(rapidjson::SizeType) {
        if (depth_-- == eventDepth && category_ == "Evaluation" && duration_ >= 0.0)
            phases[name_].push_back(duration_ * secondsInMicrosecond);
        return true;
    }

private:
    bool duration(double number) {
        if (key_ == "dur" && depth_ == eventDepth)
            duration_ = number;
        return true;
    }

    static constexpr int eventDepth = 2; // the root, then an event
    int depth_ = 0;
    std::string key_, name_, category_;
    double duration_ = -1.0;
};

} // namespace

std::map<std::string, std::vector<double>> writeTraceAndReadPhases(const std::filesystem::path& path) {
    OpenQuarn::Profiling::stop();
    storage::WholeFile file(path);
    OpenQuarn::Profiling::writeTrace(file.stream());
    if (!file.stream().flush())
        file.finish(); // says why
    std::ifstream trace(file.temporary());
    rapidjson::IStreamWrapper stream(trace);
    PhaseReader reader;
    if (!rapidjson::Reader().Parse(stream, reader))
        throw std::runtime_error(path.string() + " could not be read again for its phases");
    file.finish();
    return std::move(reader.phases);
}

} // namespace quarn
