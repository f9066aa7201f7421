// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/phaseTimes.h"

#include "openquarn_app/Profiling.h"
#include "storage/Json.h"
#include "storage/WholeFile.h"

#include <fstream>
#include <stdexcept>

namespace quarn {
namespace {

constexpr double secondsInMicrosecond = 1e-6;

// takes name, category and duration of each event as they come by: a trace may be too large for a document
class PhaseReader final : public storage::JsonEvents {
public:
    std::map<std::string, std::vector<double>> phases;

    void key(std::string_view name) override { key_ = name; }
    void text(std::string_view value) override {
        if (key_ == "name" && depth_ == eventDepth)
            name_ = value;
        else if (key_ == "cat" && depth_ == eventDepth)
            category_ = value;
    }
    void number(double value) override {
        if (key_ == "dur" && depth_ == eventDepth)
            duration_ = value;
    }
    void beginObject() override {
        if (++depth_ == eventDepth) {
            name_.clear();
            category_.clear();
            duration_ = -1.0;
        }
    }
    void endObject() override {
        if (depth_-- == eventDepth && category_ == "Evaluation" && duration_ >= 0.0)
            phases[name_].push_back(duration_ * secondsInMicrosecond);
    }

private:
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
    std::filebuf trace;
    PhaseReader reader;
    if (!trace.open(file.temporary(), std::ios::in) || !storage::parseJson(reader, trace, storage::jsonRules::trace))
        throw std::runtime_error(path.string() + " could not be read again for its phases");
    file.finish();
    return std::move(reader.phases);
}

} // namespace quarn
