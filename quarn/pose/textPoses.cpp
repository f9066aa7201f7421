// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/textPoses.h"

#include "storage/Json.h"

#include <algorithm>
#include <charconv>
#include <ostream>
#include <stdexcept>

namespace quarn {
namespace {

// in the fewest digits that read back the same
std::string digits(double number) {
    char text[32];
    return {text, std::to_chars(text, text + sizeof text, number).ptr};
}

bool isConstant(const PlugTrack& track) {
    return std::all_of(track.values.begin(), track.values.end(),
                       [&](double value) { return value == track.values.front(); });
}

std::string keysOf(const PlugTrack& track, const FrameRange& frames, const FilePlaces& places) {
    const std::size_t last = frames.count() - 1;
    const std::size_t step = isConstant(track) ? std::max<std::size_t>(1, last) : 1;
    std::string text = '"' + track.name + "\": [";
    for (std::size_t number = 0; number <= last; number += step)
        text += (number > 0 ? ", [" : "[") + std::to_string(places.frame(frames.frame(number))) + ", " +
                digits(track.values[number]) + ']';
    return text + ']';
}

[[noreturn]] void failForPlugs() {
    throw std::runtime_error("nothing of the scene moves: no plug is driven by an animation curve or sampled");
}

// quarn pose --keys is to read it
void requireReadable(std::uint64_t length) {
    if (length + 1000 > storage::jsonRules::keys.mostBytes)
        throw std::runtime_error("it would be larger than the 1 GiB that quarn pose --keys reads: choose a part with "
                                 "--frames, or write .glb");
}

} // namespace

void writeKeys(std::ostream& out, const Motion& motion, const FilePlaces& places) {
    out << "{\n\"unit\": \"radians\",\n\"interpolation\": \"linear\",\n\"keys\": {";
    std::uint64_t length = 0;
    for (const PlugTrack& track : motion.tracks) {
        if (!track.isKeyable)
            continue;
        const std::string keys = (length == 0 ? "\n" : ",\n") + keysOf(track, motion.frames, places);
        length += keys.size();
        requireReadable(length);
        out << keys;
    }
    out << "\n}\n}\n";
    if (length == 0)
        failForPlugs();
}

void writeTable(std::ostream& out, const Motion& motion, const FilePlaces& places) {
    if (motion.tracks.empty())
        failForPlugs();
    out << "frame";
    for (const PlugTrack& track : motion.tracks)
        out << ',' << track.name;
    out << '\n';
    for (std::size_t number = 0; number < motion.frames.count(); ++number) {
        out << places.frame(motion.frames.frame(number));
        for (const PlugTrack& track : motion.tracks)
            out << ',' << digits(track.values[number]);
        out << '\n';
    }
}

} // namespace quarn
