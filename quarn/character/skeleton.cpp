// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/skeleton.h"

#include "quarn/character/rootsWarning.h"
#include "quarn/character/uniqueNames.h"

#include <cmath>
#include <stdexcept>
#include <unordered_set>

namespace quarn {
namespace {

using Names = std::unordered_set<std::string>;

Names boneNames(const aiScene& scene) {
    Names names;
    for (unsigned m = 0; m < scene.mNumMeshes; ++m)
        for (unsigned b = 0; b < scene.mMeshes[m]->mNumBones; ++b)
            names.insert(scene.mMeshes[m]->mBones[b]->mName.C_Str());
    return names;
}

Names animatedNames(const aiScene& scene) {
    Names names;
    for (unsigned a = 0; a < scene.mNumAnimations; ++a)
        for (unsigned c = 0; c < scene.mAnimations[a]->mNumChannels; ++c)
            names.insert(scene.mAnimations[a]->mChannels[c]->mNodeName.C_Str());
    return names;
}

class SkeletonReader {
public:
    SkeletonReader(const aiScene& scene, const SourceHints& hints, Character& character)
        : hints_(hints)
        , character_(character)
        , bones_(boneNames(scene))
        , animated_(animatedNames(scene)) {
        markAbove(*scene.mRootNode, 0);
        read(*scene.mRootNode, -1, HMatrix());
    }

    Skeleton take() {
        checkBones();
        return std::move(skeleton_);
    }

private:
    // marks the bones and the nodes above them; true when `node` is one
    bool markAbove(const aiNode& node, int depth) {
        constexpr int mostLevels = 1000;
        if (depth > mostLevels)
            throw std::runtime_error("the hierarchy is more than " + std::to_string(mostLevels) + " levels deep");
        bool above = bones_.count(node.mName.C_Str()) > 0;
        for (unsigned i = 0; i < node.mNumChildren; ++i)
            above = markAbove(*node.mChildren[i], depth + 1) || above;
        if (above)
            needed_.insert(&node);
        return above;
    }

    // above the first joint a node counts only when it does something
    bool isJoint(const aiNode& node, int parent, const HMatrix& local) const {
        if (needed_.count(&node) == 0)
            return false;
        const std::string name = node.mName.C_Str();
        return parent >= 0 || bones_.count(name) > 0 || animated_.count(name) > 0 || local != HMatrix();
    }

    void read(const aiNode& node, int parent, const HMatrix& parentWorld) {
        const HMatrix local = rowVectorMatrix(node.mTransformation, nodeText(node));
        const HMatrix world = local * parentWorld;
        if (isJoint(node, parent, local))
            parent = addJoint(node, parent, local);
        if (node.mNumMeshes > 0)
            skeleton_.shown.push_back({&node, world, parent});
        for (unsigned i = 0; i < node.mNumChildren; ++i)
            read(*node.mChildren[i], parent, world);
    }

    std::string nodeText(const aiNode& node) const {
        return "the node \"" + hints_.nodeName(node.mName.C_Str()) + "\"";
    }

    int addJoint(const aiNode& node, int parent, const HMatrix& local) {
        const auto index = static_cast<std::uint32_t>(character_.joints.size());
        const std::string wanted = hints_.nodeName(node.mName.C_Str());
        const std::string name = names_.take(wanted, "joint" + std::to_string(index));
        if (!wanted.empty() && name != wanted)
            character_.warnings.push_back("several joints are named \"" + wanted + "\": one of them is now \"" + name +
                                          "\"");
        if (!skeleton_.jointOf.emplace(node.mName.C_Str(), index).second && bones_.count(node.mName.C_Str()) > 0)
            character_.warnings.push_back("the skin may mean another of the joints named \"" + wanted + "\"");
        character_.joints.push_back({name, parent, local, hints_.nodeIndex(node.mName.C_Str())});
        return static_cast<int>(index);
    }

    void checkBones() const {
        for (const std::string& bone : bones_)
            if (skeleton_.jointOf.count(bone) == 0)
                throw std::runtime_error("a mesh is bound to a joint \"" + hints_.nodeName(bone) +
                                         "\", but no node has that name");
    }

    const SourceHints& hints_;
    Character& character_;
    Names bones_;
    Names animated_;
    UniqueNames names_;
    std::unordered_set<const aiNode*> needed_;
    Skeleton skeleton_;
};

} // namespace

HMatrix rowVectorMatrix(const aiMatrix4x4& matrix, const std::string& owner) {
    HMatrix result;
    for (unsigned row = 0; row < 4; ++row)
        for (unsigned column = 0; column < 4; ++column) {
            result[row][column] = static_cast<double>(matrix[column][row]);
            if (!std::isfinite(result[row][column]))
                throw std::runtime_error(owner + " has a matrix with a value that is not finite");
        }
    for (unsigned row = 0; row < 4; ++row)
        if (std::abs(result[row][3] - (row == 3 ? 1.0 : 0.0)) > 1e-5)
            throw std::runtime_error(owner + " has a matrix with a perspective");
    for (unsigned row = 0; row < 4; ++row)
        result[row][3] = row == 3 ? 1.0 : 0.0;
    return result;
}

Skeleton readSkeleton(const aiScene& scene, const SourceHints& hints, Character& character) {
    Skeleton skeleton = SkeletonReader(scene, hints, character).take();
    if (const std::string warning = rootsWarning(character); !warning.empty())
        character.warnings.push_back(warning);
    return skeleton;
}

} // namespace quarn
