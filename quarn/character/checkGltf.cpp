// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/checkGltf.h"

#include "quarn/character/gltfTypes.h"

#include <algorithm>
#include <initializer_list>
#include <limits>
#include <vector>

namespace quarn {
namespace {

[[noreturn]] void refuse(const std::string& what) {
    throw std::runtime_error(what);
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

// one of the two lists of a sparse accessor: they have a view, and no stride
void checkSparsePart(const JsonValue& document, const JsonValue& sparse, const char* part, std::uint64_t count,
                     std::uint64_t size, const std::string& owner) {
    const JsonValue* from = member(sparse, part);
    const JsonValue& views = listOf(document, "bufferViews");
    const auto index =
        indexOf(from == nullptr ? nullptr : member(*from, "bufferView"), views.Size(), "bufferViews", owner);
    if (!index)
        refuse(owner + " is sparse, without \"" + part + "\" in a view");
    if (member(views[static_cast<rapidjson::SizeType>(*index)], "byteStride") != nullptr)
        refuse(owner + " is sparse, with a stride");
    checkExtent(document, *from, count, size, owner);
}

void checkSparse(const JsonValue& document, const JsonValue& accessor, std::uint64_t size, const std::string& owner) {
    const JsonValue* sparse = member(accessor, "sparse");
    if (sparse == nullptr)
        return;
    const std::uint64_t changes = sizeOf(*sparse, "count", 0, owner);
    if (changes > sizeOf(accessor, "count", 0, owner))
        refuse(owner + " changes more elements than it has");
    if (changes == 0)
        return;
    const JsonValue* indices = member(*sparse, "indices");
    const std::uint64_t type = indices == nullptr ? 0 : sizeOf(*indices, "componentType", 0, owner);
    if (type != gltfComponent::unsignedByte && type != gltfComponent::unsignedShort &&
        type != gltfComponent::unsignedInt)
        refuse(owner + " is sparse, with indices that are no unsigned whole numbers");
    checkSparsePart(document, *sparse, "indices", changes, componentBytes(type, owner), owner);
    checkSparsePart(document, *sparse, "values", changes, size, owner);
}

void checkAccessor(const JsonValue& document, std::size_t index) {
    constexpr std::uint64_t mostWithoutData = std::uint64_t{1} << 24U;
    const std::string owner = element("accessors", index);
    const JsonValue& accessor = listOf(document, "accessors")[static_cast<rapidjson::SizeType>(index)];
    const std::uint64_t count = sizeOf(accessor, "count", 0, owner);
    const std::uint64_t size =
        componentBytes(sizeOf(accessor, "componentType", 0, owner), owner) * componentCount(accessor, owner);
    checkExtent(document, accessor, count, size, owner);
    if (member(accessor, "bufferView") == nullptr && count > mostWithoutData)
        refuse(owner + ": " + std::to_string(count) + " elements without data");
    checkSparse(document, accessor, size, owner);
}

using namespace gltfComponent;

// what the values of an accessor have to be
struct Form {
    const char* type;
    std::initializer_list<std::uint64_t> componentTypes;
    const char* text;
    bool isNumber = true; ///< floats, or whole numbers that stand for -1 ... 1: these have to say so
};

// KHR_mesh_quantization: positions may be whole numbers, which stand for -1 ... 1 or for themselves
const Form positionForm{"VEC3", {single, signedByte, unsignedByte, signedShort, unsignedShort}, "positions", false};
const Form jointForm{"VEC4", {unsignedByte, unsignedShort}, "unsigned bytes or shorts by fours", false};
const Form weightForm{"VEC4", {single, unsignedByte, unsignedShort}, "weights by fours"};
const Form cornerForm{"SCALAR", {unsignedByte, unsignedShort, unsignedInt}, "unsigned whole numbers", false};
const Form matrixForm{"MAT4", {single}, "matrices of floats"};
const Form timeForm{"SCALAR", {single}, "floats"};
const Form moveForm{"VEC3", {single}, "floats by threes"};
const Form turnForm{"VEC4", {single, signedByte, unsignedByte, signedShort, unsignedShort}, "rotations by fours"};
const Form morphForm{"SCALAR", {single, signedByte, unsignedByte, signedShort, unsignedShort}, "weights"};
// KHR_mesh_quantization: also whole numbers that stand for themselves
const Form uvForm{
    "VEC2", {single, signedByte, unsignedByte, signedShort, unsignedShort}, "texture coordinates by twos", false};
// Draco decodes into what the accessor says, and nobody comes after it
const Form dracoWeightForm{"VEC4", {single}, "floats by fours"};
const Form dracoUvForm{"VEC2", {single}, "floats by twos"};

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
        const std::uint64_t component = sizeOf(accessor, "componentType", 0, owner);
        if (textOf(accessor, "type") != form.type ||
            std::find(form.componentTypes.begin(), form.componentTypes.end(), component) == form.componentTypes.end())
            refuse(name + "does not hold " + form.text);
        if (form.isNumber && component != single && !isNormalized(accessor))
            refuse(name + "has whole numbers that are not normalized");
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

void checkTargets(const Accessors& accessors, const JsonValue& primitive, std::uint64_t points,
                  const std::string& owner) {
    std::size_t index = 0;
    for (const JsonValue& target : listOf(primitive, "targets").GetArray())
        checkAttribute(accessors, target, "POSITION", positionForm, points, owner + "." + element("targets", index++));
}

// whatever the importer makes of Draco's data it makes at a safe distance, but it has to find them
bool checkDraco(const JsonValue& document, const JsonValue& primitive, const std::string& owner) {
    const JsonValue* draco = extensionOf(primitive, dracoExtension);
    if (draco == nullptr)
        return false;
    const auto view =
        indexOf(member(*draco, "bufferView"), listOf(document, "bufferViews").Size(), "bufferViews", owner);
    const JsonValue* attributes = member(*draco, "attributes");
    if (!view || attributes == nullptr || !attributes->IsObject())
        refuse(owner + " is compressed by Draco, without a view or attributes");
    for (const auto& attribute : attributes->GetObject())
        if (!attribute.value.IsUint())
            refuse(owner + " is compressed by Draco, and its attribute " + attribute.name.GetString() +
                   " is no number");
    return true;
}

void checkPrimitive(const Accessors& accessors, const JsonValue& document, const JsonValue& primitive,
                    const std::string& owner) {
    const JsonValue* attributes = member(primitive, "attributes");
    if (attributes == nullptr || !attributes->IsObject())
        refuse(owner + " has no attributes");
    const bool isDraco = checkDraco(document, primitive, owner);
    const auto points = accessors.count(member(*attributes, "POSITION"), isDraco ? moveForm : positionForm, owner);
    if (!points)
        refuse(owner + " has no positions");
    accessors.count(member(primitive, "indices"), cornerForm, owner);
    checkAttribute(accessors, *attributes, "TEXCOORD_0", isDraco ? dracoUvForm : uvForm, *points, owner);
    checkTargets(accessors, primitive, *points, owner);
    for (unsigned set = 0;; ++set) {
        const std::string joints = "JOINTS_" + std::to_string(set);
        const std::string weights = "WEIGHTS_" + std::to_string(set);
        const bool hasJoints = member(*attributes, joints.c_str()) != nullptr;
        if (hasJoints != (member(*attributes, weights.c_str()) != nullptr))
            refuse(owner + " has one of " + joints + " and " + weights + ", but not the other");
        if (!hasJoints)
            return;
        checkAttribute(accessors, *attributes, joints, jointForm, *points, owner);
        checkAttribute(accessors, *attributes, weights, isDraco ? dracoWeightForm : weightForm, *points, owner);
    }
}

// how many targets a mesh has: as many in each of its parts
void checkMesh(const Accessors& accessors, const JsonValue& document, const JsonValue& mesh, const std::string& owner) {
    std::size_t part = 0;
    const JsonValue& primitives = listOf(mesh, "primitives");
    for (const JsonValue& primitive : primitives.GetArray()) {
        const std::string name = owner + "." + element("primitives", part++);
        checkPrimitive(accessors, document, primitive, name);
        if (listOf(primitive, "targets").Size() != listOf(primitives[0], "targets").Size())
            refuse(name + " has " + std::to_string(listOf(primitive, "targets").Size()) +
                   " morph targets, but another part of the mesh " +
                   std::to_string(listOf(primitives[0], "targets").Size()));
    }
}

void checkMeshes(const JsonValue& document, const Accessors& accessors) {
    std::size_t index = 0;
    for (const JsonValue& mesh : listOf(document, "meshes").GetArray())
        checkMesh(accessors, document, mesh, element("meshes", index++));
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

void checkSampler(const Accessors& accessors, const JsonValue& sampler, const Form& form, std::uint64_t valuesOfTime,
                  const std::string& owner) {
    const auto times = accessors.count(member(sampler, "input"), timeForm, owner);
    const auto values = accessors.count(member(sampler, "output"), form, owner);
    if (!times || !values)
        refuse(owner + " has a sampler without input or output");
    const bool cubic = textOf(sampler, "interpolation") == "CUBICSPLINE";
    // a count is at most 2^53, and the targets of a mesh are a list of the file
    if (*values / (cubic ? 3 : 1) / valuesOfTime != *times || *values % (valuesOfTime * (cubic ? 3 : 1)) != 0)
        refuse(owner + " has a sampler of " + std::to_string(*times) + " times and " + std::to_string(*values) +
               " values");
}

// of the mesh at a node
std::uint64_t targetCount(const JsonValue& document, std::size_t node) {
    const JsonValue& meshes = listOf(document, "meshes");
    const JsonValue& shows = listOf(document, "nodes")[static_cast<rapidjson::SizeType>(node)];
    const auto mesh = indexOf(member(shows, "mesh"), meshes.Size(), "meshes", element("nodes", node));
    if (!mesh)
        return 0;
    const JsonValue& parts = listOf(meshes[static_cast<rapidjson::SizeType>(*mesh)], "primitives");
    return parts.Empty() ? 0 : listOf(parts[0], "targets").Size();
}

void checkChannel(const Accessors& accessors, const JsonValue& document, const JsonValue& animation,
                  const JsonValue& channel, const std::string& owner) {
    const JsonValue& samplers = listOf(animation, "samplers");
    const auto index = indexOf(member(channel, "sampler"), samplers.Size(), "samplers", owner);
    const JsonValue* target = member(channel, "target");
    if (!index || target == nullptr)
        refuse(owner + " has a channel without sampler or target");
    const auto node = indexOf(member(*target, "node"), listOf(document, "nodes").Size(), "nodes", owner);
    const std::string path = textOf(*target, "path");
    const JsonValue& sampler = samplers[static_cast<rapidjson::SizeType>(*index)];
    if (path == "translation" || path == "scale")
        checkSampler(accessors, sampler, moveForm, 1, owner);
    if (path == "rotation")
        checkSampler(accessors, sampler, turnForm, 1, owner);
    if (path != "weights" || !node)
        return;
    if (const std::uint64_t targets = targetCount(document, *node); targets > 0)
        checkSampler(accessors, sampler, morphForm, targets, owner);
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

// what is read, and what only looks do not need; all else that a file cannot do without is beyond us
void checkExtensions(const JsonValue& document) {
    for (const JsonValue& extension : listOf(document, "extensionsRequired").GetArray()) {
        const std::string name = extension.IsString() ? extension.GetString() : "";
        bool isFine = name == quantizationExtension || name == meshoptExtension || name == dracoExtension;
        for (const char* kind : {"KHR_materials_", "KHR_texture_", "KHR_lights_", "EXT_texture_", "MSFT_texture_"})
            isFine = isFine || name.rfind(kind, 0) == 0;
        if (!isFine)
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
