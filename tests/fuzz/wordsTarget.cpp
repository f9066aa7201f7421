// SPDX-License-Identifier: Apache-2.0
#include "wordsTarget.h"

#include "host/files/fileNodes.h"
#include "require.h"

#include "openquarn/HArgDatabase.h"
#include "openquarn/HSelectionList.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Session.h"

#include <cmath>
#include <sstream>
#include <string>
#include <vector>

namespace {

using Words = std::vector<std::string>;

Words wordsOf(const std::uint8_t* data, std::size_t size) {
    std::istringstream text(std::string(reinterpret_cast<const char*>(data), size));
    Words words;
    for (std::string word; std::getline(text, word);)
        words.push_back(word);
    return words;
}

HSyntax syntax() {
    HSyntax made;
    made.addFlag("-mi", "-multiIndex", HSyntax::kUnsigned);
    made.makeFlagMultiUse("-mi");
    made.addFlag("-q", "-quiet");
    made.addFlag("-on", "-active", HSyntax::kBoolean);
    made.addFlag("-r", "-range", HSyntax::kDouble, HSyntax::kLong, HSyntax::kString);
    made.addArg(HSyntax::kDouble);
    made.setObjectType(HSyntax::kStringObjects, 0, 3);
    return made;
}

bool acceptsArguments(const Words& words) {
    HArgList list;
    for (std::size_t i = 1; i < words.size(); ++i)
        list.addArg(HString(words[i].c_str()));
    HStatus status;
    const HArgDatabase parsed(syntax(), list, &status);
    if (status.error())
        return false;
    require(std::isfinite(parsed.commandArgumentDouble(0)));
    double from = 0;
    int to = 0;
    if (parsed.isFlagSet("-range"))
        require(!parsed.getFlagArgument("-r", 0, from).error() && std::isfinite(from) &&
                !parsed.getFlagArgument("-r", 1, to).error());
    for (unsigned use = 0; use < parsed.numberOfFlagUses("-multiIndex"); ++use) {
        HArgList arguments;
        require(!parsed.getFlagArgumentList("-mi", use, arguments).error() && arguments.length() == 1);
    }
    HArgList objects;
    require(!parsed.getObjects(objects).error() && objects.length() <= 3);
    return true;
}

bool findsPlug(const std::string& name) {
    HSelectionList list;
    HPlug plug;
    if (list.add(HString(name.c_str())).error() || list.getPlug(0, plug).error())
        return false;
    HSelectionList again;
    HPlug same;
    require(!again.add(plug.name()).error() && !again.getPlug(0, same).error());
    require(same == plug && same.name() == plug.name());
    return true;
}

} // namespace

bool fuzzWords(const std::uint8_t* data, std::size_t size) {
    const Words words = wordsOf(data, size);
    if (words.empty())
        return false;
    if (words.front() == "args")
        return acceptsArguments(words);
    const OpenQuarn::MessageSink before = OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {});
    bool areFound = true;
    {
        const OpenQuarn::Session session;
        fileNodes::registerTypes();
        fileNodes::create("f");
        for (const std::string& word : words)
            areFound = findsPlug(word) && areFound;
    }
    OpenQuarn::setMessageSink(before);
    return areFound;
}
