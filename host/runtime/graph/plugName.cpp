// SPDX-License-Identifier: Apache-2.0
#include "graph/plugName.h"

#include "graph/plugImpl.h"

#include <charconv>
#include <stdexcept>

namespace OpenQuarn {
namespace {

struct Step {
    std::string name;
    std::optional<unsigned> index;
};

[[noreturn]] void refuse(const std::string& node, const std::string& path, const std::string& why) {
    throw std::invalid_argument("'" + node + "." + path + "' names no plug: " + why);
}

Step readStep(const std::string& text, const std::string& node, const std::string& path) {
    const std::size_t bracket = text.find('[');
    if (bracket == std::string::npos)
        return {text, std::nullopt};
    unsigned index = 0;
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data() + bracket + 1, end, index);
    if (error != std::errc() || stop + 1 != end || *stop != ']')
        refuse(node, path, "'" + text.substr(bracket) + "' is no index");
    return {text.substr(0, bracket), index};
}

} // namespace

HPlug plugNamed(const std::shared_ptr<Node>& node, const std::string& path) {
    HPlug::Impl plug;
    plug.node = node;
    std::size_t from = 0;
    while (from <= path.size()) {
        const std::size_t dot = std::min(path.find('.', from), path.size());
        const Step step = readStep(path.substr(from, dot - from), node->name(), path);
        const Field* field = node->type().find(step.name);
        if (!field)
            refuse(node->name(), path, "node type '" + node->type().name + "' has no attribute '" + step.name + "'");
        // a child may be named without what is above it as long as nothing above is an array
        if (field->parent != plug.field && (plug.field || arrayDepth(*field) != (field->isArray() ? 1U : 0U)))
            refuse(node->name(), path, "'" + step.name + "' does not belong there");
        if (step.index && !field->isArray())
            refuse(node->name(), path, "'" + step.name + "' is not an array");
        if (plug.field && plug.field->isArray() && !plug.indices.back())
            refuse(node->name(), path, "'" + plug.field->attribute->name + "' is an array and needs an index");
        plug.field = field;
        if (field->isArray())
            plug.indices.push_back(step.index);
        from = dot + 1;
    }
    return plugOf(std::move(plug));
}

HPlug plugNamed(const Graph& graph, const std::string& name) {
    const std::size_t dot = name.find('.');
    if (dot == std::string::npos)
        throw std::invalid_argument("'" + name + "' names no plug: it has no '.'");
    const std::shared_ptr<Node> node = graph.find(name.substr(0, dot));
    if (!node)
        throw std::invalid_argument("there is no node named '" + name.substr(0, dot) + "'");
    return plugNamed(node, name.substr(dot + 1));
}

bool matchesPattern(const std::string& text, const std::string& pattern) {
    std::size_t t = 0, p = 0, star = std::string::npos, retry = 0;
    while (t < text.size()) {
        if (p < pattern.size() && (pattern[p] == '?' || pattern[p] == text[t]) && pattern[p] != '*') {
            ++t, ++p;
        } else if (p < pattern.size() && pattern[p] == '*') {
            star = p++;
            retry = t;
        } else if (star != std::string::npos) {
            p = star + 1;
            t = ++retry;
        } else {
            return false;
        }
    }
    while (p < pattern.size() && pattern[p] == '*')
        ++p;
    return p == pattern.size();
}

} // namespace OpenQuarn
