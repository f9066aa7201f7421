// SPDX-License-Identifier: Apache-2.0
#include "fileTargets.h"

#include "MemoryFile.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/Session.h"
#include "quarn/import/jsonFiles.h"
#include "quarn/pose/readKeys.h"
#include "require.h"
#include "rig/registration.h"
#include "storage/Json.h"
#include "storage/npyArray.h"

#include <cmath>
#include <functional>
#include <stdexcept>

namespace {

// true when `read` throws nothing; its error has to begin with, or hold, the name of the file
bool accepts(const std::string& name, const std::function<void()>& read) {
    try {
        read();
        return true;
    } catch (const std::runtime_error& error) {
        require(std::string(error.what()).find(name) != std::string::npos);
        return false;
    }
}

void readKeysInScene(const std::string& text, const std::string& name) {
    const OpenQuarn::MessageSink before = OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {});
    {
        const OpenQuarn::Session session;
        OpenQuarn::addPlugin("quarnRig", rig::registerNodes, rig::deregisterNodes);
        HFnDependencyNode().create("joint", "arm");
        for (const quarn::PlugKeys& keys : quarn::parseKeys(text, name))
            require(!keys.plug.isNull());
    }
    OpenQuarn::setMessageSink(before);
}

void readLimits(const std::string& path) {
    const quarn::PoseLimits all = quarn::readLimits(path);
    for (const auto& [joint, limits] : all.joints)
        for (const auto& range : limits)
            require(!range || range->first < range->second);
    for (const auto& [slider, range] : all.sliders)
        require(range.first < range.second);
}

} // namespace

bool fuzzNpyTable(const std::uint8_t* data, std::size_t size) {
    if (size == 0)
        return false;
    const MemoryFile file(data + 1, size - 1);
    return accepts(file.path(), [&] {
        if (data[0] == 'i') {
            require(4 * storage::readIntegers(file.path()).size() <= size);
            return;
        }
        const storage::FloatTable table = storage::readFloatTable(file.path());
        require(table.values.size() == table.rows * table.columns && 4 * table.values.size() <= size);
    });
}

bool fuzzSideJson(const std::uint8_t* data, std::size_t size) {
    if (size == 0)
        return false;
    const MemoryFile file(data + 1, size - 1);
    switch (data[0]) {
    case 'p':
        return accepts(file.path(), [&] { quarn::readParents(file.path()); });
    case 'l':
        return accepts(file.path(), [&] { readLimits(file.path()); });
    case 'k':
        return accepts("keys.json", [&] {
            readKeysInScene({reinterpret_cast<const char*>(data) + 1, size - 1}, "keys.json");
        });
    default:
        return accepts("", [&] { storage::readJson(file.path(), storage::jsonRules::dataset); });
    }
}
