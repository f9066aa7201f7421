// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/clips.h"

#include "quarn/console/json.h"
#include "quarn/import/animationCurves.h"
#include "quarn/import/restPose.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

// the seconds from the first key to the held frame
struct Span {
    double first;
    double held;
};

// a step is a jump between straight lines: two keys at one time
template <class Value>
Track<Value> straight(const Track<Value>& track) {
    Track<Value> lines;
    for (const Key<Value>& key : track.keys) {
        if (!lines.keys.empty())
            lines.keys.push_back({key.seconds, lines.keys.back().value});
        lines.keys.push_back(key);
    }
    return lines;
}

// tracks of one thing, one an animation; null where an animation has none of it
template <class Value>
Track<Value> joined(const std::vector<const Track<Value>*>& tracks, const std::vector<Span>& spans, const Value& rest) {
    const auto has = [](const Track<Value>* track) { return track != nullptr && !track->keys.empty(); };
    const auto isLine = [&](const auto* track) { return has(track) && track->interpolation == Interpolation::Linear; };
    Track<Value> all;
    if (std::none_of(tracks.begin(), tracks.end(), has))
        return all;
    const bool lines = std::any_of(tracks.begin(), tracks.end(), isLine);
    all.interpolation = lines ? Interpolation::Linear : Interpolation::Step;
    for (std::size_t i = 0; i < tracks.size(); ++i) {
        Track<Value> own = has(tracks[i]) ? *tracks[i] : Track<Value>{all.interpolation, {{0.0, rest}}};
        if (lines && own.interpolation == Interpolation::Step)
            own = straight(own);
        if (own.keys.front().seconds > 0.0)
            own.keys.insert(own.keys.begin(), {0.0, own.keys.front().value});
        for (const Key<Value>& key : own.keys)
            all.keys.push_back({spans[i].first + key.seconds, key.value});
        if (i + 1 < tracks.size())
            all.keys.push_back({spans[i].held, own.keys.back().value});
    }
    return all;
}

std::vector<Span> spansOf(const std::vector<const Animation*>& animations, double framesPerSecond,
                          std::vector<ClipRange>& ranges) {
    constexpr double mostFrames = 100000.0;
    std::vector<Span> spans;
    double frame = 1.0;
    for (const Animation* animation : animations) {
        const double end = frame + lastFrameOf(animation->seconds, framesPerSecond) - 1.0;
        // a last key between two frames is over at the next
        const bool isWhole = animation->seconds * framesPerSecond - (end - frame) < 1e-3;
        if (!(end <= mostFrames))
            throw std::runtime_error("with the animation \"" + animation->name +
                                     "\" there are more than 100000 frames");
        const double held = end + (isWhole ? 1.0 : 2.0);
        ranges.push_back({animation->name, static_cast<int>(frame), static_cast<int>(end)});
        spans.push_back({(frame - 1.0) / framesPerSecond, (held - 1.0) / framesPerSecond});
        frame = held + 1.0;
    }
    return spans;
}

class ClipLayer {
public:
    ClipLayer(const Character& character, const std::vector<const Animation*>& animations, std::vector<Span> spans)
        : character_(character)
        , animations_(animations)
        , spans_(std::move(spans))
        , rests_(splitRests(character, &allChannels())) {}

    Animation lay() {
        Animation all;
        for (const Animation* animation : animations_)
            all.name += (all.name.empty() ? "" : ", ") + animation->name;
        all.seconds = spans_.back().first + animations_.back()->seconds;
        for (std::uint32_t joint = 0; joint < character_.joints.size(); ++joint)
            layJoint(joint, all);
        for (std::uint32_t mesh = 0; mesh < character_.meshes.size(); ++mesh)
            for (std::uint32_t target = 0; target < character_.meshes[mesh].morphTargets.size(); ++target)
                layTarget(mesh, target, all);
        return all;
    }

private:
    // for the signs of scales
    const Animation& allChannels() {
        for (const Animation* animation : animations_)
            channels_.channels.insert(channels_.channels.end(), animation->channels.begin(), animation->channels.end());
        return channels_;
    }

    void layJoint(std::uint32_t joint, Animation& all) const {
        std::vector<const Track<HVector>*> moves, scales;
        std::vector<const Track<HQuaternion>*> turns;
        bool isMoved = false;
        for (const Animation* animation : animations_) {
            const auto channel = std::find_if(animation->channels.begin(), animation->channels.end(),
                                              [&](const JointChannel& each) { return each.joint == joint; });
            const bool has = channel != animation->channels.end();
            isMoved = isMoved || has;
            moves.push_back(has ? &channel->translation : nullptr);
            turns.push_back(has ? &channel->rotation : nullptr);
            scales.push_back(has ? &channel->scale : nullptr);
        }
        const JointRest& rest = rests_[joint];
        if (isMoved)
            all.channels.push_back({joint, joined(moves, spans_, rest.translate), joined(turns, spans_, rest.orient),
                                    joined(scales, spans_, rest.scale)});
    }

    void layTarget(std::uint32_t mesh, std::uint32_t target, Animation& all) const {
        std::vector<const Track<double>*> weights;
        for (const Animation* animation : animations_) {
            const auto channel =
                std::find_if(animation->morphs.begin(), animation->morphs.end(),
                             [&](const MorphChannel& each) { return each.mesh == mesh && each.target == target; });
            weights.push_back(channel == animation->morphs.end() ? nullptr : &channel->weight);
        }
        Track<double> track = joined(weights, spans_, character_.meshes[mesh].morphTargets[target].restWeight);
        if (!track.keys.empty())
            all.morphs.push_back({mesh, target, std::move(track)});
    }

    const Character& character_;
    const std::vector<const Animation*>& animations_;
    std::vector<Span> spans_;
    Animation channels_;
    std::vector<JointRest> rests_;
};

} // namespace

Clips layClips(const Character& character, const std::vector<const Animation*>& animations, double framesPerSecond) {
    Clips clips;
    if (animations.size() == 1) {
        clips.animation = *animations.front();
        clips.ranges = {{clips.animation.name, 1, lastFrameOf(clips.animation.seconds, framesPerSecond)}};
        return clips;
    }
    std::vector<Span> spans = spansOf(animations, framesPerSecond, clips.ranges);
    clips.animation = ClipLayer(character, animations, std::move(spans)).lay();
    return clips;
}

std::string clipsText(const std::vector<ClipRange>& ranges) {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    writer.StartArray();
    for (const ClipRange& range : ranges) {
        writer.StartObject();
        writer.Key("name");
        writer.String(range.name.data(), static_cast<rapidjson::SizeType>(range.name.size()));
        writer.Key("first");
        writer.Int(range.firstFrame);
        writer.Key("last");
        writer.Int(range.lastFrame);
        writer.EndObject();
    }
    writer.EndArray();
    return {buffer.GetString(), buffer.GetSize()};
}

} // namespace quarn
