// SPDX-License-Identifier: Apache-2.0
#include "selfCheck.h"

#include <algorithm>
#include <cmath>
#include <map>

namespace replay {
namespace {

// The value of a key that is best to change: of numbers the largest, which no tolerance hides. An empty list, which
// gets an element, only where every other value is one too.
struct Candidate {
    Case* owner = nullptr;
    Json* value = nullptr;
    std::string where;
    double size = -1.0;
};

double sizeOf(const Json& value) {
    if (!value.IsNumber())
        return 1.0;
    const double size = std::abs(value.GetDouble());
    return std::isfinite(size) ? size : -1.0;
}

// Collects one candidate per key. key: where the value stands without list positions; where: with them.
class Candidates {
public:
    void collect(Case& owner, Json& value, const std::string& key, const std::string& where) {
        if (value.IsObject()) {
            for (auto& member : value.GetObject()) {
                const std::string name = member.name.GetString();
                const std::string dot = key.empty() ? "" : ".";
                collect(owner, member.value, key + dot + name, where + (where.empty() ? "" : ".") + name);
            }
            return;
        }
        if (value.IsArray() && !value.Empty()) {
            for (rapidjson::SizeType i = 0; i < value.Size(); ++i)
                collect(owner, value[i], key, where + '[' + std::to_string(i) + ']');
            return;
        }
        Candidate& best = byKey[key];
        if (value.IsArray() && !best.value)
            best = {&owner, &value, where + ".length", best.size};
        else if (!value.IsArray() && !value.IsNull() && sizeOf(value) > best.size)
            best = {&owner, &value, where, sizeOf(value)};
    }

    std::map<std::string, Candidate> byKey;
};

void perturb(Json& value, JsonAllocator& allocator) {
    if (value.IsArray())
        value.PushBack("x", allocator);
    else if (value.IsBool())
        value.SetBool(!value.GetBool());
    else if (value.IsString())
        value.SetString((std::string(value.GetString(), value.GetStringLength()) + "x").c_str(), allocator);
    else if (value.IsUint64())
        value.SetUint64(value.GetUint64() + 1);
    else if (value.IsInt64())
        value.SetInt64(value.GetInt64() + 1);
    else
        value.SetDouble(value.GetDouble() * 1.001);
}

bool noticed(const Kind& kind, const Candidate& candidate) {
    const auto disagreements = replayCase(kind, *candidate.owner, candidate.owner->tolerance);
    return std::any_of(disagreements.begin(), disagreements.end(),
                       [&](const Disagreement& d) { return d.where == candidate.where; });
}

} // namespace

SelfCheckResult selfCheck(const Kind& kind, const std::vector<Case*>& cases) {
    Candidates candidates;
    for (Case* owner : cases)
        candidates.collect(*owner, owner->expected(), "", "");
    SelfCheckResult result;
    for (auto& [key, candidate] : candidates.byKey) {
        if (!candidate.value) {
            result.unperturbed.push_back(key);
            continue;
        }
        JsonAllocator& allocator = candidate.owner->document.GetAllocator();
        const Json original(*candidate.value, allocator);
        perturb(*candidate.value, allocator);
        if (!noticed(kind, candidate))
            result.unnoticed.push_back(key);
        candidate.value->CopyFrom(original, allocator);
        ++result.perturbed;
    }
    return result;
}

} // namespace replay
