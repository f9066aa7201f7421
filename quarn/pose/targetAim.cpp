// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/targetAim.h"

#include "quarn/pose/skinCache.h"
#include "quarn/pose/targetCache.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/units.h"

#include <algorithm>
#include <cmath>

namespace quarn {
namespace {

// of the cache, those that the deformer exports; all where it exports none
void chooseFrames(TargetFrames& chosen, const Warp& warp, double startFrame) {
    const double first = std::ceil(numberOf(warp.plug("exportStartFrame")) - startFrame);
    const double last = std::floor(numberOf(warp.plug("exportEndFrame")) - startFrame);
    const auto end = static_cast<double>(chosen.count - 1);
    const bool hasSome = first <= end && last >= 0.0 && first <= last;
    chosen.first = hasSome ? static_cast<std::size_t>(std::max(first, 0.0)) : 0;
    chosen.last = hasSome ? static_cast<std::size_t>(std::min(last, end)) : chosen.count - 1;
}

FitContext contextOf(const SceneFrames& frames, const TargetFile& file, CacheRole role) {
    FitContext context;
    context.isSkin = role == CacheRole::skin;
    context.what = file.cache.filename().string();
    context.metersPerUnit = metersPerUnit();
    context.startFrame = file.startFrame;
    context.axes = frames.space().axes == "z" ? fromZUp : AxisTurn{};
    context.scale = frames.space().scale;
    context.canAlign = true;
    return context;
}

} // namespace

TargetAim aimCache(OpenQuarn::Session& host, const Warp& warp, const WarpGeometry& geometry, SceneFrames& frames,
                   const TargetFile& file, CacheRole role, const AimOptions& options, const Console& console) {
    TargetAim aim;
    aim.context = contextOf(frames, file, role);
    aim.startFrame = file.startFrame;
    TargetFrames compared;
    compared.count = frames.frameCount();
    compared.reach = affordableReach(frames.vertexCount());
    compared.read = [&](std::size_t frame, std::vector<double>& xyz) { frames.read(frame, xyz); };
    compared.time = [&](std::size_t frame) { return file.startFrame + static_cast<double>(frame); };
    chooseFrames(compared, warp, file.startFrame);
    WarpGeometry skinned = geometry;
    if (role == CacheRole::skin) {
        skinned.input = ownSkin(geometry);
        compared.role = "skin";
    }
    aim.fit = compareWithSkin(host, skinned, restMesh(geometry), compared, console);
    if (!aim.fit)
        return aim;
    aim.isAligned = options.align && !aim.fit->causes.empty();
    tell(verdictOf(*aim.fit, aim.context, aim.isAligned), options.anyway, console);
    if (!aim.isAligned)
        return aim;
    frames.change(aim.fit->change);
    aim.startFrame -= static_cast<double>(aim.fit->change.shift);
    return aim;
}

std::string aimText(const TargetAim& aim) {
    if (!aim.fit)
        return "";
    const FitDistance& distance = aim.isAligned ? aim.fit->mended : aim.fit->asItIs;
    const std::string text = "it is " + distanceText(distance, aim.fit->diagonal, aim.context) + "\n";
    return aim.isAligned ? "it was aligned, since it looked as if " + causeText(*aim.fit, aim.context) + "\n" + text
                         : text;
}

} // namespace quarn
