// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/checkGltf.h"

#include <algorithm>
#include <array>
#include <initializer_list>
#include <limits>
#include <string_view>
#include <utility>
#include <vector>

namespace quarn {
namespace {

[[noreturn]] void refuse(const std::string& what) {
    throw std::runtime_error(what);
}

std::uint64_t componentBytes(const JsonValue& accessor, const std::string& owner) {
    switch (sizeOf(accessor, "componentType", 0, owner)) {
    case 5120:
    case 5121:
        return 1;
    case 5122:
    case 5123:
        return 2;
    case 5125:
    case 5126:
        return 4;
    default:
        refuse(owner + ": \"componentType\" is none of glTF's");
    }
}

std::uint64_t componentCount(const JsonValue& accessor, const std::string& owner) {
    static constexpr std::array<std::pair<std::string_view, unsigned>, 7> types{
        {{"SCALAR", 1}, {"VEC2", 2}, {"VEC3", 3}, {"VEC4", 4}, {"MAT2", 4}, {"MAT3", 9}, {"MAT4", 16}}};
    const std::string type = textOf(accessor, "type");
    for (const auto& [name, count] : types)
        if (type == name)
            return count;
    refuse(owner + ": \"type\" is \"" + type + "\", which is none of glTF's");
}

void checkView(const JsonValue& document, std::size_t index) {
    const std::string owner = element("bufferViews", index);
    const JsonValue& view = listOf(document, "bufferViews")[static_cast<rapidjson::SizeType>(index)];
    const JsonValue& buffers = listOf(document, "buffers");
    const auto buffer = indexOf(member(view, "buffer"), buffers.Size(), "buffers", owner);
    if (!buffer)
        refuse(owner + " has no buffer");
    const std::uint64_t length =
        sizeOf(buffers[static_cast<rapidjson::SizeType>(*buffer)], "byteLength", 0, element("buffers", *buffer));
    if (sizeOf(view, "byteOffset", 0, owner) + sizeOf(view, "byteLength", 0, owner) > length)
        refuse(owner + " leaves its buffer, which has " + std::to_string(length) + " bytes");
}

// `count` elements of `size` bytes, from an offset of the view on
void checkExtent(const JsonValue& document, const JsonValue& from, std::uint64_t count, std::uint64_t size,
                 const std::string& owner) {
    const JsonValue& views = listOf(document, "bufferViews");
    const auto index = indexOf(member(from, "bufferView"), views.Size(), "bufferViews", owner);
    if (!index || count == 0)
        return;
    const JsonValue& view = views[static_cast<rapidjson::SizeType>(*index)];
    const std::uint64_t length = sizeOf(view, "byteLength", 0, owner);
    const std::uint64_t stride = sizeOf(view, "byteStride", size, owner);
    const std::uint64_t offset = sizeOf(from, "byteOffset", 0, owner);
    if (stride < size || stride > 4096)
        refuse(owner + ": a stride of " + std::to_string(stride) + " bytes for elements of " + std::to_string(size));
    // no overflow: sizes are at most 2^53, and a count is compared with the length first
    if (count > length || offset + (count - 1) * stride + size > length)
        refuse(owner + ": " + std::to_string(count) + " elements leave " + element("bufferViews", *index));
}

void checkAccessor(const JsonValue& document, std::size_t index) {
    constexpr std::uint64_t mostWithoutData = std::uint64_t{1} << 24U;
    const std::string owner = element("accessors", index);
    const JsonValue& accessor = listOf(document, "accessors")[static_cast<rapidjson::SizeType>(index)];
    const std::uint64_t count = sizeOf(accessor, "count", 0, owner);
    checkExtent(document, accessor, count, componentBytes(accessor, owner) * componentCount(accessor, owner), owner);
    if (member(accessor, "bufferView") == nullptr && count > mostWithoutData)
        refuse(owner + ": " + std::to_string(count) + " elements without data");
}

// what the values of an accessor have to be
struct Form {
    const char* type;
    std::initializer_list<std::uint64_t> componentTypes;
    const char* text;
};

const Form positionForm{"VEC3", {5126}, "floats by threes"};
const Form jointForm{"VEC4", {5121, 5123}, "unsigned bytes or shorts by fours"};
const Form weightForm{"VEC4", {5126}, "floats by fours"};
const Form cornerForm{"SCALAR", {5121, 5123, 5125}, "unsigned whole numbers"};
const Form matrixForm{"MAT4", {5126}, "matrices of floats"};
const Form timeForm{"SCALAR", {5126}, "floats"};
const Form turnForm{"VEC4", {5126}, "floats by fours"};

class Accessors {
public:
    explicit Accessors(const JsonValue& document)
        : accessors_(listOf(document, "accessors")) {}

    /// How many values the accessor has, nothing when `index` is null. Throws when they are of another form.
    std::optional<std::uint64_t> count(const JsonValue* index, const Form& form, const std::string& owner) const {
        const auto found = indexOf(index, accessors_.Size(), "accessors", owner);
        if (!found)
            return std::nullopt;
        const JsonValue& accessor = accessors_[static_cast<rapidjson::SizeType>(*found)];
        const std::string name = owner + " uses " + element("accessors", *found) + ", which ";
        if (member(accessor, "sparse") != nullptr)
            refuse(name + "is sparse: this is not supported");
        const std::uint64_t component = sizeOf(accessor, "componentType", 0, owner);
        if (textOf(accessor, "type") != form.type ||
            std::find(form.componentTypes.begin(), form.componentTypes.end(), component) == form.componentTypes.end())
            refuse(name + "does not hold " + form.text);
        return sizeOf(accessor, "count", 0, owner);
    }

private:
    const JsonValue& accessors_;
};

void checkAttribute(const Accessors& accessors, const JsonValue& attributes, const std::string& name, const Form& form,
                    std::uint64_t points, const std::string& owner) {
    const auto count = accessors.count(member(attributes, name.c_str()), form, owner);
    if (count && *count != points)
        refuse(owner + ": " + name + " has " + std::to_string(*count) + " values for " + std::to_string(points) +
               " positions");
}

void checkPrimitive(const Accessors& accessors, const JsonValue& primitive, const std::string& owner) {
    const JsonValue* attributes = member(primitive, "attributes");
    if (attributes == nullptr || !attributes->IsObject())
        refuse(owner + " has no attributes");
    const auto points = accessors.count(member(*attributes, "POSITION"), positionForm, owner);
    if (!points)
        refuse(owner + " has no positions");
    accessors.count(member(primitive, "indices"), cornerForm, owner);
    for (unsigned set = 0;; ++set) {
        const std::string joints = "JOINTS_" + std::to_string(set);
        const std::string weights = "WEIGHTS_" + std::to_string(set);
        const bool hasJoints = member(*attributes, joints.c_str()) != nullptr;
        if (hasJoints != (member(*attributes, weights.c_str()) != nullptr))
            refuse(owner + " has one of " + joints + " and " + weights + ", but not the other");
        if (!hasJoints)
            return;
        checkAttribute(accessors, *attributes, joints, jointForm, *points, owner);
        checkAttribute(accessors, *attributes, weights, weightForm, *points, owner);
    }
}

void checkMeshes(const JsonValue& document, const Accessors& accessors) {
    std::size_t index = 0;
    for (const JsonValue& mesh : listOf(document, "meshes").GetArray()) {
        std::size_t part = 0;
        for (const JsonValue& primitive : listOf(mesh, "primitives").GetArray())
            checkPrimitive(accessors, primitive, element("meshes", index) + "." + element("primitives", part++));
        ++index;
    }
}

void checkSkins(const JsonValue& document, const Accessors& accessors) {
    std::size_t index = 0;
    for (const JsonValue& skin : listOf(document, "skins").GetArray()) {
        const std::string owner = element("skins", index++);
        const JsonValue& joints = listOf(skin, "joints");
        std::vector<bool> seen(listOf(document, "nodes").Size());
        for (const JsonValue& joint : joints.GetArray()) {
            const std::size_t node = indexOf(&joint, seen.size(), "nodes", owner).value();
            if (seen[node])
                refuse(owner + " has " + element("nodes", node) + " twice");
            seen[node] = true;
        }
        const auto matrices = accessors.count(member(skin, "inverseBindMatrices"), matrixForm, owner);
        if (matrices && *matrices < joints.Size())
            refuse(owner + " has " + std::to_string(joints.Size()) + " joints, but " + std::to_string(*matrices) +
                   " inverse bind matrices");
    }
}

void checkSampler(const Accessors& accessors, const JsonValue& sampler, const Form& form, const std::string& owner) {
    const auto times = accessors.count(member(sampler, "input"), timeForm, owner);
    const auto values = accessors.count(member(sampler, "output"), form, owner);
    if (!times || !values)
        refuse(owner + " has a sampler without input or output");
    const bool cubic = textOf(sampler, "interpolation") == "CUBICSPLINE";
    if (*values != *times * (cubic ? 3 : 1))
        refuse(owner + " has a sampler of " + std::to_string(*times) + " times and " + std::to_string(*values) +
               " values");
}

void checkChannel(const Accessors& accessors, const JsonValue& document, const JsonValue& animation,
                  const JsonValue& channel, const std::string& owner) {
    const JsonValue& samplers = listOf(animation, "samplers");
    const auto sampler = indexOf(member(channel, "sampler"), samplers.Size(), "samplers", owner);
    const JsonValue* target = member(channel, "target");
    if (!sampler || target == nullptr)
        refuse(owner + " has a channel without sampler or target");
    indexOf(member(*target, "node"), listOf(document, "nodes").Size(), "nodes", owner);
    const std::string path = textOf(*target, "path");
    if (path == "translation" || path == "rotation" || path == "scale")
        checkSampler(accessors, samplers[static_cast<rapidjson::SizeType>(*sampler)],
                     path == "rotation" ? turnForm : positionForm, owner);
}

void checkAnimations(const JsonValue& document, const Accessors& accessors) {
    std::size_t index = 0;
    for (const JsonValue& animation : listOf(document, "animations").GetArray()) {
        const std::string owner = element("animations", index++);
        for (const JsonValue& channel : listOf(animation, "channels").GetArray())
            checkChannel(accessors, document, animation, channel, owner);
    }
}

// the parent of every node, or the number of nodes
std::vector<std::size_t> parentsOf(const JsonValue& nodes) {
    std::vector<std::size_t> parents(nodes.Size(), nodes.Size());
    std::size_t index = 0;
    for (const JsonValue& node : nodes.GetArray()) {
        for (const JsonValue& entry : listOf(node, "children").GetArray()) {
            const std::size_t child = indexOf(&entry, nodes.Size(), "nodes", element("nodes", index)).value();
            if (parents[child] != nodes.Size())
                refuse(element("nodes", child) + " is a child twice");
            parents[child] = index;
        }
        ++index;
    }
    return parents;
}

// an importer and a scene walk the hierarchy by recursion
void checkHierarchy(const JsonValue& nodes) {
    constexpr std::size_t mostLevels = 1000;
    const std::vector<std::size_t> parents = parentsOf(nodes);
    for (std::size_t node = 0; node < parents.size(); ++node) {
        std::size_t levels = 0;
        for (std::size_t above = node; above != parents.size(); above = parents[above])
            if (++levels > mostLevels)
                refuse(element("nodes", node) + " is its own ancestor, or more than " + std::to_string(mostLevels) +
                       " levels deep");
    }
}

// each mesh goes with one skin: the importer keeps one for all the nodes that show it
void checkNodes(const JsonValue& document) {
    const JsonValue& nodes = listOf(document, "nodes");
    const std::size_t skins = listOf(document, "skins").Size();
    constexpr std::size_t none = std::numeric_limits<std::size_t>::max();
    std::vector<std::size_t> skinOf(listOf(document, "meshes").Size(), none);
    std::size_t index = 0;
    for (const JsonValue& node : nodes.GetArray()) {
        const std::string owner = element("nodes", index++);
        const auto mesh = indexOf(member(node, "mesh"), skinOf.size(), "meshes", owner);
        const auto skin = indexOf(member(node, "skin"), skins, "skins", owner);
        if (!mesh || !skin)
            continue;
        if (skinOf[*mesh] != none && skinOf[*mesh] != *skin)
            refuse(element("meshes", *mesh) + " is bound to two skins, which is not supported");
        skinOf[*mesh] = *skin;
    }
    checkHierarchy(nodes);
}

// what only looks do not need is left out; all else that a file cannot do without is beyond us
void checkExtensions(const JsonValue& document) {
    for (const JsonValue& extension : listOf(document, "extensionsRequired").GetArray()) {
        const std::string name = extension.IsString() ? extension.GetString() : "";
        bool looks = false;
        for (const char* kind : {"KHR_materials_", "KHR_texture_", "KHR_lights_", "EXT_texture_", "MSFT_texture_"})
            looks = looks || name.rfind(kind, 0) == 0;
        if (!looks)
            refuse("the file needs the glTF extension \"" + name + "\", which is not supported");
    }
}

void checkScenes(const JsonValue& document) {
    const JsonValue& scenes = listOf(document, "scenes");
    indexOf(member(document, "scene"), scenes.Size(), "scenes", "the file");
    for (const JsonValue& scene : scenes.GetArray())
        for (const JsonValue& root : listOf(scene, "nodes").GetArray())
            indexOf(&root, listOf(document, "nodes").Size(), "nodes", "a scene");
}

} // namespace

void checkGltf(const JsonValue& document) {
    checkExtensions(document);
    for (std::size_t view = 0; view < listOf(document, "bufferViews").Size(); ++view)
        checkView(document, view);
    for (std::size_t accessor = 0; accessor < listOf(document, "accessors").Size(); ++accessor)
        checkAccessor(document, accessor);
    const Accessors accessors(document);
    checkMeshes(document, accessors);
    checkSkins(document, accessors);
    checkAnimations(document, accessors);
    checkNodes(document);
    checkScenes(document);
}

} // namespace quarn
