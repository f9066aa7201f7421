// SPDX-License-Identifier: Apache-2.0
#include "compare.h"

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include <algorithm>
#include <cmath>

namespace replay {
namespace {

std::string text(const Json& value) {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer, rapidjson::UTF8<>, rapidjson::UTF8<>, rapidjson::CrtAllocator,
                      rapidjson::kWriteNanAndInfFlag>
        writer(buffer);
    value.Accept(writer);
    constexpr std::size_t longest = 120;
    std::string all = buffer.GetString();
    return all.size() <= longest ? all : all.substr(0, longest) + "...";
}

bool isInteger(const Json& value) {
    return value.IsInt64() || value.IsUint64();
}

bool numbersAgree(const Json& expected, const Json& actual, double tolerance) {
    if (isInteger(expected) && isInteger(actual))
        return expected == actual;
    const double e = expected.GetDouble();
    const double a = actual.GetDouble();
    if (std::isnan(e) || std::isnan(a))
        return std::isnan(e) && std::isnan(a);
    return a == e || std::abs(a - e) <= tolerance * std::max(1.0, std::abs(e));
}

class Comparison {
public:
    explicit Comparison(double tolerance)
        : tolerance_(tolerance) {}

    void values(const Json& expected, const Json& actual, const std::string& where) {
        if (expected.IsObject() && actual.IsObject())
            objects(expected, actual, where);
        else if (expected.IsArray() && actual.IsArray())
            arrays(expected, actual, where);
        else if (expected.IsNumber() && actual.IsNumber() ? !numbersAgree(expected, actual, tolerance_)
                                                          : expected != actual)
            found.push_back({where, text(expected), text(actual)});
    }

    std::vector<Disagreement> found;

private:
    void objects(const Json& expected, const Json& actual, const std::string& where) {
        const std::string prefix = where.empty() ? "" : where + '.';
        for (const auto& member : expected.GetObject()) {
            const auto counterpart = actual.FindMember(member.name);
            const std::string path = prefix + member.name.GetString();
            if (counterpart == actual.MemberEnd())
                found.push_back({path, text(member.value), "(no comparison)"});
            else
                values(member.value, counterpart->value, path);
        }
        for (const auto& member : actual.GetObject())
            if (!expected.HasMember(member.name))
                found.push_back({prefix + member.name.GetString(), "(no such key)", text(member.value)});
    }

    void arrays(const Json& expected, const Json& actual, const std::string& where) {
        if (expected.Size() != actual.Size())
            found.push_back({where + ".length", std::to_string(expected.Size()), std::to_string(actual.Size())});
        for (rapidjson::SizeType i = 0; i < std::min(expected.Size(), actual.Size()); ++i)
            values(expected[i], actual[i], where + '[' + std::to_string(i) + ']');
    }

    double tolerance_;
};

} // namespace

std::vector<Disagreement> compare(const Json& expected, const Json& actual, double tolerance) {
    Comparison comparison(tolerance);
    comparison.values(expected, actual, "");
    return std::move(comparison.found);
}

} // namespace replay
