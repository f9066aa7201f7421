// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/readKeys.h"

#include "openquarn/HFnAttribute.h"
#include "quarn/pose/smoothSlopes.h"
#include "quarn/scene/PoseControls.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/sliders.h"
#include "storage/Json.h"
#include "storage/readWholeFile.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <map>
#include <stdexcept>

namespace quarn {
namespace {

constexpr double largestFrame = 1e8;
constexpr double radiansPerDegree = 3.14159265358979323846 / 180.0;

std::string textOf(const storage::JsonValue& value) {
    return {value.GetString(), value.GetStringLength()};
}

// one file of keys, for messages that begin with its name
class KeysReader {
public:
    explicit KeysReader(const std::string& name)
        : name_(name) {}

    std::vector<PlugKeys> read(const std::string& text) {
        const storage::JsonDocument file = parse(text);
        if (!file.IsObject())
            fail("holds no JSON object");
        checkMembers(file);
        degrees_ = choice(file, "unit", {"radians", "degrees"}) == 1;
        constexpr std::array kinds{PoseKeys::Kind::linear, PoseKeys::Kind::spline, PoseKeys::Kind::step};
        kind_ = kinds[static_cast<std::size_t>(choice(file, "interpolation", {"linear", "smooth", "step"}))];
        const auto keys = file.FindMember("keys");
        if (keys == file.MemberEnd() || !keys->value.IsObject() || keys->value.ObjectEmpty())
            fail(R"(has no "keys", an object with a list of [frame, value] for each plug)");
        std::vector<PlugKeys> plugs;
        plugs.reserve(keys->value.MemberCount());
        for (const auto& member : keys->value.GetObject())
            plugs.push_back(plugKeys(textOf(member.name), member.value));
        return plugs;
    }

private:
    [[noreturn]] void fail(const std::string& why) const { throw std::runtime_error(name_ + " " + why); }

    storage::JsonDocument parse(const std::string& text) const {
        try {
            return storage::parseJson(text, storage::jsonRules::keys);
        } catch (const storage::JsonError& error) {
            fail("is no JSON at " + std::string(error.what()));
        }
    }

    void checkMembers(const storage::JsonValue& object) const {
        std::map<std::string, int> seen{{"unit", 0}, {"interpolation", 0}, {"keys", 0}};
        for (const auto& member : object.GetObject()) {
            const auto known = seen.find(textOf(member.name));
            if (known == seen.end())
                fail("has an unknown member \"" + textOf(member.name) +
                     R"("; there are "unit", "interpolation", "keys")");
            if (++known->second > 1)
                fail("has \"" + known->first + "\" twice");
        }
    }

    // the number of the label that the member has; 0 without it
    int choice(const storage::JsonValue& object, const char* member, const std::vector<std::string>& labels) const {
        const auto found = object.FindMember(member);
        if (found == object.MemberEnd())
            return 0;
        const auto label =
            found->value.IsString() ? std::find(labels.begin(), labels.end(), textOf(found->value)) : labels.end();
        if (label == labels.end()) {
            std::string known;
            for (const std::string& each : labels)
                known += (known.empty() ? "\"" : ", \"") + each + "\"";
            fail(std::string("has a \"") + member + "\" that is none of " + known);
        }
        return static_cast<int>(label - labels.begin());
    }

    PlugKeys plugKeys(const std::string& name, const storage::JsonValue& list) {
        PlugKeys made;
        made.plug = usablePlug(name);
        if (!list.IsArray() || list.Empty())
            fail("has no list of [frame, value] for " + name);
        const double unit = degrees_ && isAngle(made.plug) ? radiansPerDegree : 1.0;
        for (const storage::JsonValue& key : list.GetArray())
            addKey(name, key, unit, made.keys);
        made.keys.kind = kind_;
        made.keys.isMotion = true;
        if (kind_ == PoseKeys::Kind::spline)
            made.keys.slopes = smoothSlopes(made.keys.times, made.keys.values);
        for (const double slope : made.keys.slopes)
            if (!std::isfinite(slope))
                fail("has keys of " + name + " that are too steep to be smoothed");
        return made;
    }

    void addKey(const std::string& name, const storage::JsonValue& key, double unit, PoseKeys& keys) const {
        const std::string which = "key " + std::to_string(keys.times.size() + 1) + " of " + name;
        if (!key.IsArray() || key.Size() != 2 || !key[0].IsNumber() || !key[1].IsNumber())
            fail("has a " + which + " that is not [frame, value], two numbers");
        const double frame = key[0].GetDouble();
        if (std::abs(frame) > largestFrame)
            fail("has a " + which + " beyond frame 100000000");
        if (!keys.times.empty() && frame <= keys.times.back())
            fail("has a " + which + " that is not after the one before it");
        keys.times.push_back(frame);
        keys.values.push_back(key[1].GetDouble() * unit);
    }

    HPlug usablePlug(const std::string& name) {
        HPlug plug;
        try {
            plug = findControl(name);
        } catch (const std::runtime_error& error) {
            fail("names a plug that cannot be found: " + std::string(error.what()));
        }
        const std::string fullName = writtenName(plug);
        if (const std::string why = whyNotKeyable(plug); !why.empty())
            fail("names " + name + ", which " + why);
        if (const auto [known, isNew] = nameByPlug_.emplace(fullName, name); !isNew)
            fail("has keys for " + fullName + " twice" + (name == known->second ? "" : ", once as " + name));
        return plug;
    }

    static bool isAngle(const HPlug& plug) {
        const HObject whole = HFnAttribute(plug.attribute()).parent();
        const std::string name = whole.isNull() ? "" : HFnAttribute(whole).name().asChar();
        return nodeType(plug.node()) == "joint" && (name == "rotate" || name == "jointOrient");
    }

    std::string name_;
    bool degrees_ = false;
    PoseKeys::Kind kind_ = PoseKeys::Kind::linear;
    std::map<std::string, std::string> nameByPlug_; ///< as it was written
};

} // namespace

std::vector<PlugKeys> parseKeys(const std::string& text, const std::string& name) {
    return KeysReader(name).read(text);
}

std::vector<PlugKeys> readKeys(const std::filesystem::path& file) {
    return parseKeys(storage::readWholeFile(file, storage::jsonRules::keys.mostBytes), file.string());
}

} // namespace quarn
