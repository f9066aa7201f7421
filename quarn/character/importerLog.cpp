// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/importerLog.h"

#include <assimp/DefaultLogger.hpp>
#include <assimp/LogStream.hpp>

namespace quarn {
namespace {

class WarningStream : public Assimp::LogStream {
public:
    explicit WarningStream(std::vector<std::string>& warnings)
        : warnings_(warnings) {}

    // a line is "Warn,  T0: text", with a line break
    void write(const char* message) override {
        std::string text(message);
        const std::size_t colon = text.find(": ");
        if (colon != std::string::npos)
            text.erase(0, colon + 2);
        while (!text.empty() && (text.back() == '\n' || text.back() == '.'))
            text.pop_back();
        warnings_.push_back("the importer says: " + text);
    }

private:
    std::vector<std::string>& warnings_;
};

} // namespace

ImporterLog::ImporterLog(std::vector<std::string>& warnings) {
    Assimp::Logger* log = Assimp::DefaultLogger::create("", Assimp::Logger::NORMAL, 0);
    log->attachStream(new WarningStream(warnings), Assimp::Logger::Warn); // the log owns it
}

ImporterLog::~ImporterLog() {
    Assimp::DefaultLogger::kill();
}

} // namespace quarn
