// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/JointTracks.h"

#include <algorithm>
#include <cmath>

namespace quarn {
namespace {

// of the file's numbers, which are in single precision, and of a few products of them
constexpr double rounding = 1e-6;

bool isNear(double a, double b) {
    return std::abs(a - b) <= rounding * (1.0 + std::abs(b));
}

bool isNear(const HMatrix& a, const HMatrix& b) {
    for (unsigned i = 0; i < 16; ++i)
        if (!isNear(a(i / 4, i % 4), b(i / 4, i % 4)))
            return false;
    return true;
}

template <std::size_t N>
bool isNear(const std::array<float, N>& a, const std::array<float, N>& b) {
    return std::equal(a.begin(), a.end(), b.begin(),
                      [](float x, float y) { return isNear(static_cast<double>(x), static_cast<double>(y)); });
}

// whether a part moves; what does not is made the file's
template <class Part>
bool keepsMoving(std::vector<NodePose>& poses, Part NodePose::*part, const NodePose& rest) {
    for (const NodePose& pose : poses)
        if (!isNear(pose.*part, rest.*part))
            return true;
    for (NodePose& pose : poses)
        pose.*part = rest.*part;
    return false;
}

} // namespace

JointTracks::JointTracks(const GltfNodes& nodes, const std::vector<std::size_t>& joints,
                         const std::vector<std::vector<HMatrix>>& worlds)
    : nodes_(nodes)
    , places_(nodes.count()) {
    for (std::size_t joint = 0; joint < joints.size(); ++joint)
        tracks_.push_back(trackOf(joints[joint], worlds[joint]));
}

JointTrack JointTracks::trackOf(std::size_t joint, const std::vector<HMatrix>& wanted) {
    JointTrack track;
    track.node = joint;
    std::vector<HMatrix> above(wanted.size());
    if (nodes_.parent(joint) != nodes_.count())
        above = placesOf(nodes_.parent(joint), wanted.size());
    std::vector<HMatrix> locals;
    bool moves = false;
    for (std::size_t frame = 0; frame < wanted.size(); ++frame) {
        locals.push_back(wanted[frame] * above[frame].inverse()); // the identity of a singular one: nothing is seen
        moves = moves || !isNear(locals.back(), nodes_.rest(joint));
    }
    const NodePose rest = poseOf(nodes_.rest(joint));
    if (moves) {
        for (const HMatrix& local : locals)
            track.poses.push_back(poseOf(local, track.poses.empty() ? rest : track.poses.back()));
        track.isTranslated = keepsMoving(track.poses, &NodePose::translation, rest);
        track.isRotated = keepsMoving(track.poses, &NodePose::rotation, rest);
        track.isScaled = keepsMoving(track.poses, &NodePose::scale, rest);
    }
    std::vector<HMatrix>& places = places_[joint];
    for (std::size_t frame = 0; frame < wanted.size(); ++frame)
        places.push_back((track.isAnimated() ? track.poses[frame].matrix() : nodes_.rest(joint)) * above[frame]);
    return track;
}

// of a node that is no joint: at rest below its parent
std::vector<HMatrix>& JointTracks::placesOf(std::size_t node, std::size_t frames) {
    std::vector<HMatrix>& places = places_[node];
    if (!places.empty())
        return places;
    std::vector<HMatrix> above(frames);
    if (nodes_.parent(node) != nodes_.count())
        above = placesOf(nodes_.parent(node), frames);
    for (const HMatrix& place : above)
        places.push_back(nodes_.rest(node) * place);
    return places;
}

std::vector<HMatrix> JointTracks::worlds(std::size_t frame) const {
    std::vector<HMatrix> locals = nodes_.rests();
    for (const JointTrack& track : tracks_)
        if (track.isAnimated())
            locals[track.node] = track.poses[frame].matrix();
    return nodes_.worlds(locals);
}

} // namespace quarn
