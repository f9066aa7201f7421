// SPDX-License-Identifier: Apache-2.0
#include "host/faults/FaultRows.h"

#include "openquarn/HArgDatabase.h"
#include "openquarn/HGlobal.h"
#include "openquarn/HPxCommand.h"
#include "openquarn/HSelectionList.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Session.h"

#include <optional>
#include <stdexcept>

namespace {

HSyntax syntax() {
    HSyntax made;
    made.addFlag("-n", "-number", HSyntax::kLong);
    made.addArg(HSyntax::kLong);
    made.setObjectType(HSyntax::kStringObjects);
    return made;
}

HArgList words() {
    HArgList list;
    list.addArg(7);
    list.addArg("-n");
    list.addArg(1);
    return list;
}

// the status that a call writes through its last argument
template <class Call>
std::function<HStatus()> written(Call call) {
    return [call]() {
        HStatus status;
        call(&status);
        return status;
    };
}

// the status that a call on the parsed words returns
template <class Call>
std::function<HStatus()> parsed(Call call) {
    return [call]() { return call(HArgParser(syntax(), words())); };
}

// calls from inside of a running command
class InCommand : public HPxCommand {
public:
    explicit InCommand(const std::function<HStatus()>& call)
        : call_(call) {}
    HStatus doIt(const HArgList& /*args*/) override { return call_(); }

private:
    std::function<HStatus()> call_;
};

std::function<HStatus()> inCommand(const std::function<HStatus()>& call) {
    return [call]() -> HStatus {
        OpenQuarn::addCommand("commandsRow", [call] { return new InCommand(call); });
        const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand("commandsRow");
        OpenQuarn::removeCommand("commandsRow");
        return outcome.ok ? HStatus() : HStatus(HStatus::kFailure, outcome.error);
    };
}

HStatus lookUp() {
    std::optional<OpenQuarn::Session> own;
    try {
        own.emplace();
    } catch (const std::runtime_error&) {
        own.reset(); // another row keeps one open
    }
    HSyntax name;
    name.addArg(HSyntax::kString);
    HArgList list;
    list.addArg("time1");
    HSelectionList selection;
    return HArgDatabase(name, list).getCommandArgument(0, selection);
}

HStatus getResult() {
    HCommandResult result;
    HGlobal::executeCommand("help print", result);
    HString text;
    return result.getResult(text);
}

} // namespace

std::vector<FaultRow> commandsRows() {
    using Parser = const HArgParser&;
    return {
        {"HArgList::asString", written([](HStatus* status) { words().asString(0, status); })},
        {"HArgList::asInt", written([](HStatus* status) { words().asInt(0, status); })},
        {"HArgList::asDouble", written([](HStatus* status) { words().asDouble(0, status); })},
        {"HArgList::asBool", written([](HStatus* status) { words().asBool(2, status); })},
        {"HSyntax::addFlag", [] { return HSyntax().addFlag("-f", "-flag"); }},
        {"HSyntax::makeFlagMultiUse", [] { return syntax().makeFlagMultiUse("-n"); }},
        {"HSyntax::addArg", [] { return HSyntax().addArg(HSyntax::kLong); }},
        {"HSyntax::setObjectType", [] { return HSyntax().setObjectType(HSyntax::kStringObjects); }},
        {"HArgParser::HArgParser", written([](HStatus* status) { HArgParser(syntax(), words(), status); })},
        {"HArgParser::isFlagSet", parsed([](Parser parser) {
             HStatus status;
             parser.isFlagSet("-n", &status);
             return status;
         })},
        {"HArgParser::getFlagArgument", parsed([](Parser parser) {
             int number = 0;
             return parser.getFlagArgument("-n", 0, number);
         })},
        {"HArgParser::getFlagArgumentList", parsed([](Parser parser) {
             HArgList list;
             return parser.getFlagArgumentList("-n", 0, list);
         })},
        {"HArgParser::commandArgumentString", parsed([](Parser parser) {
             HStatus status;
             parser.commandArgumentString(0, &status);
             return status;
         })},
        {"HArgParser::commandArgumentInt", parsed([](Parser parser) {
             HStatus status;
             parser.commandArgumentInt(0, &status);
             return status;
         })},
        {"HArgParser::commandArgumentDouble", parsed([](Parser parser) {
             HStatus status;
             parser.commandArgumentDouble(0, &status);
             return status;
         })},
        {"HArgParser::commandArgumentBool",
         [] {
             HSyntax oneBoolean;
             oneBoolean.addArg(HSyntax::kBoolean);
             HArgList list;
             list.addArg("on");
             HStatus status;
             HArgParser(oneBoolean, list).commandArgumentBool(0, &status);
             return status;
         }},
        {"HArgParser::getCommandArgument", parsed([](Parser parser) {
             int number = 0;
             return parser.getCommandArgument(0, number);
         })},
        {"HArgParser::getObjects", parsed([](Parser parser) {
             HArgList list;
             return parser.getObjects(list);
         })},
        {"HArgDatabase::HArgDatabase", written([](HStatus* status) { HArgDatabase(syntax(), words(), status); })},
        {"HArgDatabase::getCommandArgument", lookUp},
        {"HPxCommand::setResult", inCommand([] { return HPxCommand::setResult(1); })},
        {"HPxCommand::appendToResult", inCommand([] { return HPxCommand::appendToResult(1.5); })},
        {"HCommandResult::getResult", getResult},
        {"HGlobal::executeCommand", [] { return HGlobal::executeCommand("help"); }},
    };
}
