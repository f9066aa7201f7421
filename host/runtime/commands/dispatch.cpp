// SPDX-License-Identifier: Apache-2.0
#include "commands/dispatch.h"

#include "commands/CommandRegistry.h"
#include "commands/Results.h"
#include "commands/WordValues.h"
#include "core/Object.h"
#include "core/apiCall.h"
#include "core/threads.h"

#include <memory>

namespace OpenQuarn {
namespace {

// commands that run themselves end in a sentence, not at the end of the stack
constexpr int deepest = 100;

HArgList argsOf(const std::vector<ScriptWord>& words) {
    HArgList args;
    auto& list = Access::impl(args);
    list.reserve(words.size());
    for (auto word = words.begin() + 1; word != words.end(); ++word)
        list.push_back({HString(word->text), word->quoted});
    return args;
}

// keeps the plug-in's code in place while an object of its command lives
class Running {
public:
    explicit Running(const CommandType& type)
        : type_(type) {
        ++type_.running;
    }
    ~Running() { --type_.running; }
    Running(const Running&) = delete;
    Running& operator=(const Running&) = delete;

private:
    const CommandType& type_;
};

HStatus runObject(const std::shared_ptr<const CommandType>& type, const HArgList& args) {
    try {
        const Running running(*type);
        const std::unique_ptr<HPxCommand> command(type->create());
        if (!command)
            return {HStatus::kInsufficientMemory, "the command could not be created"};
        Access::impl(*command) = type;
        return command->doIt(args);
    } catch (const std::exception& error) {
        return {HStatus::kFailure, std::string("the command threw an exception: ") + error.what()};
    } catch (...) {
        return {HStatus::kFailure, "the command threw an exception of an unknown type"};
    }
}

HStatus run(const std::vector<ScriptWord>& words, CommandValue& result) {
    const std::string& name = words.front().text;
    const std::shared_ptr<const CommandType> type = CommandRegistry::instance().find(name);
    if (!type)
        return {HStatus::kNotFound, "there is no command " + inQuotes(name)};
    if (RunningResult::depth() >= deepest)
        return {HStatus::kFailure, name + ": commands run each other more than " + std::to_string(deepest) + " deep"};
    RunningResult running;
    const HStatus status = runObject(type, argsOf(words));
    if (status.error())
        return {status.statusCode(), name + ": " + status.errorString().asStdString()};
    result = running.take();
    return {};
}

} // namespace

HStatus dispatch(const std::vector<ScriptWord>& words, CommandValue& result) noexcept {
    try {
        result = std::monostate();
        if (HStatus refused = threadStatus({"running a command", ThreadTag::main}); refused.error())
            return refused;
        return run(words, result);
    } catch (...) {
        return statusOfException("running a command");
    }
}

} // namespace OpenQuarn
