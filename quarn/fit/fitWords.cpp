// SPDX-License-Identifier: Apache-2.0
#include "quarn/fit/fitWords.h"

#include "quarn/console/numberText.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <iomanip>
#include <locale>
#include <sstream>

namespace quarn {
namespace {

std::string shortNumber(double value) {
    std::ostringstream text;
    text.imbue(std::locale::classic());
    text.precision(3);
    if (std::abs(value) >= 1000.0 && std::abs(value) < 1e9)
        text << std::fixed << std::setprecision(0);
    text << value;
    return text.str();
}

std::string length(double value, const FitContext& context) {
    return shortNumber(1000.0 * context.metersPerUnit * value) + " mm";
}

std::string share(double value, double diagonal) {
    return shortNumber(diagonal > 0.0 ? 100.0 * value / diagonal : 0.0) + " % of the mesh";
}

std::string shiftText(const TargetFit& fit) {
    const std::ptrdiff_t by = std::abs(fit.change.shift);
    const bool isBlurred = fit.leastShift < fit.mostShift;
    std::string text = "it were " + std::string(isBlurred ? "about " : "") +
                       (by == 1 ? std::string("one frame") : std::to_string(by) + " frames") +
                       (fit.change.shift > 0 ? " late" : " early");
    if (isBlurred) {
        const auto [least, most] = std::minmax({std::abs(fit.leastShift), std::abs(fit.mostShift)});
        text += " (" + std::to_string(least) + " to " + std::to_string(most) +
                " fit alike: the motion is too slow to tell them apart)";
    }
    return text;
}

// of a factor above 1 the unit of the numbers, and that in which they would be so many times smaller
std::pair<const char*, const char*> unitsOf(double factor) {
    static constexpr struct {
        double factor;
        const char *small, *large;
    } known[] = {{10.0, "millimetres", "centimetres"}, {100.0, "centimetres", "metres"},
                 {1000.0, "millimetres", "metres"},    {25.4, "millimetres", "inches"},
                 {2.54, "centimetres", "inches"},      {1.0 / 0.0254, "inches", "metres"},
                 {1.0 / 0.3048, "feet", "metres"}};
    for (const auto& row : known)
        if (std::abs(factor / row.factor - 1.0) < 1e-6)
            return {row.small, row.large};
    return {"one unit", "another"};
}

std::string scaleText(double scale) {
    const bool isLarge = scale < 1.0;
    const double factor = isLarge ? 1.0 / scale : scale;
    const auto [small, large] = unitsOf(factor);
    return "its numbers were " + shortNumber(factor) + " times too " + (isLarge ? "large" : "small") + " (" +
           (isLarge ? small : large) + " against " + (isLarge ? large : small) + ")";
}

std::string axesText(const AxisTurn& axes) {
    if (axes == fromZUp)
        return "its z were up, and the scene's y is";
    if (axes == fromYUp)
        return "its y were up, and the scene's z is";
    const auto reversed = std::count(axes.sign.begin(), axes.sign.end(), -1);
    if (axes.from == AxisTurn{}.from && reversed == 1)
        return std::string("it were mirrored in ") +
               "xyz"[std::find(axes.sign.begin(), axes.sign.end(), -1) - axes.sign.begin()];
    std::string text = "its ";
    for (std::size_t axis = 0; axis < 3; ++axis)
        text += std::string(axis == 0 ? "" : ", ") + (axes.sign[axis] < 0 ? "-" : "") + "xyz"[axes.from[axis]];
    text += " were the scene's x, y, z";
    return axes.isMirror() ? text + ", which is mirrored" : text;
}

std::string placeText(const CacheChange& change, const FitContext& context) {
    if (change.offset != FitPoint{})
        return "it lay " + length(fitDistance(change.offset, {}), context) + " beside " + context.reference() +
               ", as in the space of another node";
    std::string text = change.axes.isNone() ? "" : axesText(change.axes);
    if (change.scale != 1.0)
        text += (text.empty() ? "" : ", and as if ") + scaleText(change.scale);
    return text;
}

bool isIn(const TargetFit& fit, Cause cause) {
    return std::find(fit.causes.begin(), fit.causes.end(), cause) != fit.causes.end();
}

// what the flags would have to say, after what they have said already
std::string placeFlags(const TargetFit& fit, const FitContext& context) {
    const AxisTurn axes = context.axes.then(fit.change.axes);
    const bool hasFlag = axes.isNone() || axes == fromZUp;
    if (!hasFlag || fit.change.offset != FitPoint{})
        return "";
    std::string flags;
    if (!fit.change.axes.isNone())
        flags = std::string("--axes ") + (axes.isNone() ? "y" : "z");
    if (fit.change.scale != 1.0)
        flags += (flags.empty() ? "--scale " : " --scale ") + numberText(context.scale * fit.change.scale);
    return flags;
}

double shiftedStart(const TargetFit& fit, const FitContext& context) {
    return context.startFrame.value_or(1.0) - static_cast<double>(fit.change.shift);
}

// the cache's first frame is the one that is taken for its rest
std::string orderFlags(const TargetFit& fit, const FitContext& context) {
    if (!fit.restFrame || (*fit.restFrame > 0 && !context.startFrame))
        return "";
    const double frame = shiftedStart(fit, context) + static_cast<double>(*fit.restFrame);
    return *fit.restFrame == 0 ? "--order rest" : "--order rest --rest-frame " + numberText(frame);
}

std::string remedyText(const TargetFit& fit, const FitContext& context) {
    const std::string flags = flagText(fit, context);
    const std::string with = flags.empty() ? "With that mended" : "With " + flags;
    return with + " it would be " + length(fit.mended.mean, context) + " from " + context.reference() +
           " in the mean; " + (context.canAlign ? "--align" : "quarn target --align") + " does that";
}

std::string notFiniteText(const FitDistance& distance, const FitContext& context) {
    return context.what + ": vertex " + std::to_string(distance.notFinite->vertex) + " of its frame " +
           std::to_string(distance.notFinite->frame) + " has no finite position";
}

std::string beyondText(const FitDistance& distance, double diagonal, const FitContext& context) {
    std::string text = context.what + " is " + length(distance.mean, context) + " from " + context.reference() +
                       " in the mean, " + share(distance.mean, diagonal);
    if (distance.mean <= fitLimit::mean * diagonal)
        text += ", but up to " + length(*distance.largestAtRest, context) + ", " +
                share(*distance.largestAtRest, diagonal) + ", where the skin is at rest";
    return text;
}

std::string strangersText(const TargetFit& fit) {
    if (fit.motion.posedFrames == 0)
        return "the skin is at rest in all of them, so that these frames do not belong to these poses";
    return "no shift, unit, axes or order of vertices brings it near: these frames do not belong to these poses";
}

// what is the matter; empty where nothing is
std::string matterText(const TargetFit& fit, const FitContext& context, bool isMended, bool isBeyond) {
    if (!isMended && !fit.causes.empty())
        return "it looks as if " + causeText(fit, context) + ". " + remedyText(fit, context);
    if (fit.motion.following == Following::no)
        return strangersText(fit);
    if (!isBeyond)
        return "";
    if (context.isSkin)
        return fit.motion.following == Following::yes
                   ? "it goes with the poses, but further from it than other skins of the same joints use to be"
                   : "whether these frames belong to these poses cannot be told";
    return fit.motion.following == Following::yes ? "it goes with the poses, but too far from them for a correction"
                                                  : strangersText(fit);
}

// a skin of another kind is none the worse for its distance, as long as it is not another character's, or in other
// poses
bool isRefused(const TargetFit& fit, const FitDistance& distance, const FitContext& context, bool isMended) {
    return !context.isSkin || isBeyondAtRest(distance, fit.diagonal) || fit.motion.following == Following::no ||
           (!isMended && !fit.causes.empty());
}

std::string untoldNote(const TargetFit& fit, const FitDistance& distance) {
    if (distance.frames < 2 || fit.motion.following != Following::untold)
        return "";
    const bool keepsStill = fit.motion.size < distance.mean;
    return std::string("whether these frames belong to these poses cannot be told: ") +
           (keepsStill ? "the skin moves too little in them" : "too few are away from rest");
}

std::string slowNote(const TargetFit& fit, const FitContext& context) {
    if (!fit.isTooSlow)
        return "";
    std::string hint;
    if (fit.nearerShift != 0 && context.startFrame)
        hint = "; with --start-frame " + numberText(*context.startFrame - static_cast<double>(fit.nearerShift)) +
               " it would be " + length(fit.nearerMean, context) + " from it";
    return "from frame to frame the skin moves " + length(*fit.motion.ofAStep, context) +
           " in the mean, too slow to tell whether the " + (context.isSkin ? "cache" : "target") +
           " is a frame early or late" + hint;
}

} // namespace

std::string distanceText(const FitDistance& distance, double diagonal, const FitContext& context) {
    return length(distance.mean, context) + " from " + context.reference() + " in the mean (" +
           share(distance.mean, diagonal) + "), " + length(distance.largest, context) + " at most, in " +
           std::to_string(distance.frames) + (distance.frames == 1 ? " frame" : " frames");
}

std::string causeText(const TargetFit& fit, const FitContext& context) {
    std::string text;
    for (const Cause cause : fit.causes) {
        const std::string one = cause == Cause::shift   ? shiftText(fit)
                                : cause == Cause::order ? "its vertices were in another order"
                                                        : placeText(fit.change, context);
        text += (text.empty() ? "" : ", and as if ") + one;
    }
    return text;
}

std::string flagText(const TargetFit& fit, const FitContext& context) {
    std::vector<std::string> flags;
    if (isIn(fit, Cause::place))
        flags.push_back(placeFlags(fit, context));
    if (isIn(fit, Cause::order))
        flags.push_back(orderFlags(fit, context));
    if (isIn(fit, Cause::shift))
        flags.push_back(context.startFrame
                            ? "--start-frame " + numberText(*context.startFrame - static_cast<double>(fit.change.shift))
                            : "");
    std::string text;
    for (const std::string& flag : flags) {
        if (flag.empty())
            return "";
        text += (text.empty() ? "" : " ") + flag;
    }
    return text;
}

FitVerdict verdictOf(const TargetFit& fit, const FitContext& context, bool isMended) {
    const FitDistance& distance = isMended ? fit.mended : fit.asItIs;
    const bool isBeyond = isBeyondLimits(distance, fit.diagonal);
    const std::string matter = matterText(fit, context, isMended, isBeyond);
    FitVerdict verdict;
    if (!std::isfinite(distance.mean))
        verdict.refusal = notFiniteText(distance, context);
    else if (isBeyond && isRefused(fit, distance, context, isMended))
        verdict.refusal = beyondText(distance, fit.diagonal, context) + ": " + matter + "; --anyway takes it as it is";
    else if (isBeyond)
        verdict.warning = beyondText(distance, fit.diagonal, context) + ": " + matter;
    else if (!matter.empty() || distance.notFinite)
        verdict.warning = matter.empty() ? notFiniteText(distance, context) : context.what + ": " + matter;
    if (!verdict.refusal.empty() || !verdict.warning.empty())
        return verdict;
    verdict.note = untoldNote(fit, distance);
    if (verdict.note.empty())
        verdict.note = slowNote(fit, context);
    return verdict;
}

} // namespace quarn
