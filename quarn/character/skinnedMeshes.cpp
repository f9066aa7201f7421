// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/skinnedMeshes.h"

#include "quarn/character/cornerUvs.h"
#include "quarn/character/joinVertices.h"
#include "quarn/character/morphTargets.h"
#include "quarn/character/uniqueNames.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>
#include <set>
#include <stdexcept>

namespace quarn {
namespace {

[[noreturn]] void refuse(const CharacterMesh& mesh, const std::string& what) {
    throw std::runtime_error("the mesh \"" + mesh.name + "\" " + what);
}

void appendPoints(const aiMesh& part, CharacterMesh& mesh) {
    if (part.mNumVertices > 0 && part.mVertices == nullptr)
        refuse(mesh, "has no positions");
    if (mesh.points.size() + part.mNumVertices > std::numeric_limits<std::int32_t>::max())
        refuse(mesh, "has too many vertices");
    mesh.points.reserve(mesh.points.size() + part.mNumVertices);
    for (unsigned i = 0; i < part.mNumVertices; ++i) {
        const aiVector3D& p = part.mVertices[i];
        if (!std::isfinite(p.x) || !std::isfinite(p.y) || !std::isfinite(p.z))
            refuse(mesh, "has a position that is not finite at vertex " + std::to_string(i));
        mesh.points.emplace_back(static_cast<double>(p.x), static_cast<double>(p.y), static_cast<double>(p.z));
    }
}

// gives the number of faces that are points or lines
std::size_t appendPolygons(const aiMesh& part, std::uint32_t firstPoint, CharacterMesh& mesh) {
    std::size_t skipped = 0;
    for (unsigned f = 0; f < part.mNumFaces; ++f) {
        const aiFace& face = part.mFaces[f];
        for (unsigned c = 0; c < face.mNumIndices; ++c)
            if (face.mIndices[c] >= part.mNumVertices)
                refuse(mesh, "has a polygon with vertex " + std::to_string(face.mIndices[c]) + " of " +
                                 std::to_string(part.mNumVertices));
        if (face.mNumIndices < 3) {
            ++skipped;
            continue;
        }
        mesh.polygonSizes.push_back(face.mNumIndices);
        for (unsigned c = 0; c < face.mNumIndices; ++c)
            mesh.corners.push_back(firstPoint + face.mIndices[c]);
    }
    if (mesh.corners.size() > static_cast<std::size_t>(std::numeric_limits<std::int32_t>::max()))
        refuse(mesh, "has too many polygons");
    return skipped;
}

void addBinding(CharacterMesh& mesh, const Binding& binding) {
    for (const Binding& known : mesh.bindings)
        if (known.joint == binding.joint)
            return;
    mesh.bindings.push_back(binding);
}

void appendWeights(const aiBone& bone, std::uint32_t joint, std::uint32_t firstPoint, std::uint32_t count,
                   CharacterMesh& mesh) {
    for (unsigned w = 0; w < bone.mNumWeights; ++w) {
        const aiVertexWeight& weight = bone.mWeights[w];
        if (weight.mVertexId >= count)
            refuse(mesh, "has a weight of vertex " + std::to_string(weight.mVertexId) + " of " + std::to_string(count));
        if (!std::isfinite(weight.mWeight))
            refuse(mesh, "has a weight that is not finite at vertex " + std::to_string(weight.mVertexId));
        // a zero says nothing, and the importer makes some up at vertex 0
        if (weight.mWeight != 0)
            mesh.influences[firstPoint + weight.mVertexId].push_back({joint, static_cast<double>(weight.mWeight)});
    }
}

void appendSkin(const aiMesh& part, std::uint32_t firstPoint, const Skeleton& skeleton, CharacterMesh& mesh) {
    for (unsigned b = 0; b < part.mNumBones; ++b) {
        const aiBone& bone = *part.mBones[b];
        const std::uint32_t joint = skeleton.jointOf.at(bone.mName.C_Str());
        addBinding(mesh, {joint, rowVectorMatrix(bone.mOffsetMatrix, "a binding of the mesh \"" + mesh.name + "\"")});
        appendWeights(bone, joint, firstPoint, part.mNumVertices, mesh);
    }
}

// by rising joint, and one influence a joint
void tidy(std::vector<Influence>& influences) {
    std::stable_sort(influences.begin(), influences.end(),
                     [](const Influence& a, const Influence& b) { return a.joint < b.joint; });
    std::size_t count = 0;
    for (const Influence& influence : influences)
        if (count > 0 && influences[count - 1].joint == influence.joint)
            influences[count - 1].weight += influence.weight;
        else
            influences[count++] = influence;
    influences.resize(count);
    influences.erase(
        std::remove_if(influences.begin(), influences.end(), [](const Influence& i) { return i.weight == 0; }),
        influences.end());
}

void warnOfSkin(const CharacterMesh& mesh, std::vector<std::string>& warnings) {
    const std::string name = "the mesh \"" + mesh.name + "\" ";
    if (mesh.bindings.empty()) {
        warnings.push_back(name + "has no skin");
        return;
    }
    std::size_t without = 0;
    std::size_t uneven = 0;
    for (const auto& influences : mesh.influences) {
        double sum = 0.0;
        for (const Influence& influence : influences)
            sum += influence.weight;
        without += influences.empty() ? 1U : 0U;
        // as exporters round them to bytes
        uneven += !influences.empty() && std::abs(sum - 1.0) > 0.01 ? 1U : 0U;
    }
    if (without > 0)
        warnings.push_back(name + "has " + std::to_string(without) + " vertices without influence, of " +
                           std::to_string(mesh.points.size()));
    if (uneven > 0)
        warnings.push_back(name + "has " + std::to_string(uneven) + " vertices whose weights do not add up to 1");
}

class MeshReader {
public:
    MeshReader(const aiScene& scene, const Skeleton& skeleton, const SourceHints& hints, ControlPoints& control,
               Character& character)
        : scene_(scene)
        , skeleton_(skeleton)
        , hints_(hints)
        , control_(control)
        , character_(character) {}

    void read(const ShownNode& shown) {
        CharacterMesh mesh;
        mesh.name = names_.take(hints_.nodeName(shown.node->mName.C_Str()), "mesh");
        mesh.worldTransform = shown.worldTransform;
        mesh.parentJoint = shown.parentJoint;
        mesh.sourceNode = hints_.nodeIndex(shown.node->mName.C_Str());
        std::size_t skipped = 0;
        std::vector<std::uint32_t> partSizes;
        std::vector<ImportedPart> parts;
        for (unsigned i = 0; i < shown.node->mNumMeshes; ++i) {
            const std::size_t before = mesh.points.size();
            skipped += append(shown.node->mMeshes[i], mesh);
            parts.push_back({scene_.mMeshes[shown.node->mMeshes[i]], static_cast<std::uint32_t>(before)});
            partSizes.push_back(static_cast<std::uint32_t>(mesh.points.size() - before));
        }
        const std::string node = shown.node->mName.C_Str();
        addMorphTargets(hints_, node, partSizes, mesh, character_.warnings);
        for (auto& influences : mesh.influences)
            tidy(influences);
        std::sort(mesh.bindings.begin(), mesh.bindings.end(),
                  [](const Binding& a, const Binding& b) { return a.joint < b.joint; });
        if (finish(std::move(mesh), parts, skipped))
            meshOf_.emplace(node, static_cast<std::uint32_t>(character_.meshes.size() - 1));
    }
    MeshIndices take() { return std::move(meshOf_); }

private:
    std::size_t append(unsigned index, CharacterMesh& mesh) {
        if (index >= scene_.mNumMeshes)
            refuse(mesh, "is missing");
        const aiMesh& part = *scene_.mMeshes[index];
        const auto firstPoint = static_cast<std::uint32_t>(mesh.points.size());
        appendPoints(part, mesh);
        if (const std::size_t unusable = appendUvs(part, mesh); unusable > 0)
            character_.warnings.push_back("the mesh \"" + mesh.name + "\" has " + std::to_string(unusable) +
                                          " texture coordinates that are not finite; they are 0");
        mesh.influences.resize(mesh.points.size());
        appendSkin(part, firstPoint, skeleton_, mesh);
        if (part.mNumAnimMeshes > 0)
            character_.warnings.push_back("the mesh \"" + mesh.name + "\" has morph targets, which are not read");
        return appendPolygons(part, firstPoint, mesh);
    }

    // false when nothing is left of the mesh
    bool finish(CharacterMesh mesh, const std::vector<ImportedPart>& parts, std::size_t skipped) {
        const std::string name = "the mesh \"" + mesh.name + "\" ";
        takeCornerUvs(mesh);
        const std::size_t collapsed = joinVertices(mesh);
        joinUvs(mesh);
        if (skipped > 0)
            character_.warnings.push_back(name + "has " + std::to_string(skipped) +
                                          " points or lines, which are left out");
        if (collapsed > 0)
            character_.warnings.push_back(name + "has " + std::to_string(collapsed) +
                                          " polygons with less than three different corners, which are left out");
        if (mesh.polygonSizes.empty()) {
            character_.warnings.push_back(name + "has no polygons and is left out");
            return false;
        }
        warnOfSkin(mesh, character_.warnings);
        if (control_.areCounted())
            countControlPoints(parts, mesh);
        character_.meshes.push_back(std::move(mesh));
        return true;
    }

    void countControlPoints(const std::vector<ImportedPart>& parts, CharacterMesh& mesh) {
        ControlPointMap map = control_.mapOf(parts, mesh.joinedOf);
        mesh.fileOrder = map.problem.empty() ? FileOrder::controlPoints : FileOrder::corners;
        if (map.problem.empty())
            mesh.joinedOf = std::move(map.vertexOf);
        else
            character_.warnings.push_back("the mesh \"" + mesh.name + "\" " + map.problem +
                                          ": its file order is that of the importer's corners");
    }

    const aiScene& scene_;
    const Skeleton& skeleton_;
    const SourceHints& hints_;
    ControlPoints& control_;
    Character& character_;
    UniqueNames names_;
    MeshIndices meshOf_;
};

// where a joint was when the meshes were bound should not depend on the mesh
void warnOfSkins(Character& character) {
    std::map<std::uint32_t, const HMatrix*> bound;
    std::set<std::uint32_t> different;
    for (const CharacterMesh& mesh : character.meshes)
        for (const Binding& binding : mesh.bindings)
            if (!bound.emplace(binding.joint, &binding.inverseBind).first->second->isEquivalent(binding.inverseBind))
                different.insert(binding.joint);
    for (const std::uint32_t joint : different)
        character.warnings.push_back("several skins: the meshes are not all bound to \"" +
                                     character.joints[joint].name + "\" by the same matrix");
}

} // namespace

MeshIndices readMeshes(const aiScene& scene, const Skeleton& skeleton, const SourceHints& hints, ControlPoints& control,
                       Character& character) {
    MeshReader reader(scene, skeleton, hints, control, character);
    for (const ShownNode& shown : skeleton.shown)
        reader.read(shown);
    warnOfSkins(character);
    return reader.take();
}

} // namespace quarn
