// SPDX-License-Identifier: Apache-2.0
// A limb that bends: right targets under every kind of motion, and the same with a mistake in them.
#include "quarn/fit/fitWords.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cmath>
#include <numeric>
#include <random>

namespace {

using quarn::Cause;
using quarn::Following;
using quarn::TargetFit;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using Points = std::vector<double>;

constexpr std::size_t rings = 20, around = 10, vertices = rings * around, frames = 60;
constexpr double diagonal = 1.06;

/// One long, a metre above the ground, bent and twisted about its middle.
Points limb(double bend, double twist, double bulge) {
    Points xyz;
    for (std::size_t ring = 0; ring < rings; ++ring) {
        const double along = static_cast<double>(ring) / (rings - 1);
        const double angle = bend * std::clamp((along - 0.4) / 0.2, 0.0, 1.0);
        for (std::size_t place = 0; place < around; ++place) {
            const double about = 2.0 * std::acos(-1.0) * static_cast<double>(place) / around;
            const double turned = about + twist * along;
            const double radius = 0.1 * (1.0 + 0.2 * std::cos(about)) * (1.0 - 0.4 * along) +
                                  bulge * std::exp(-50.0 * (along - 0.45) * (along - 0.45)) * std::cos(about - 0.5);
            const double x = along - 0.5, y = radius * std::cos(turned), z = 1.3 * radius * std::sin(turned);
            const double c = x > 0.0 ? std::cos(angle) : 1.0, s = x > 0.0 ? std::sin(angle) : 0.0;
            xyz.insert(xyz.end(), {x * c - y * s, x * s + y * c + 1.0, z});
        }
    }
    return xyz;
}

/// How the limb moves: bend and twist of every frame. The first frame is at rest.
struct Move {
    std::vector<double> bend, twist;
};

Move poses(unsigned seed) {
    std::mt19937 random(seed);
    std::uniform_real_distribution<double> angle(0.0, 2.0);
    Move move{{0.0}, {0.0}};
    while (move.bend.size() < frames) {
        move.bend.push_back(angle(random));
        move.twist.push_back(angle(random) - 1.0);
    }
    return move;
}

Move swing(double size, double pace) {
    Move move;
    for (std::size_t frame = 0; frame < frames; ++frame) {
        move.bend.push_back(size * (1.0 - std::cos(pace * static_cast<double>(frame))));
        move.twist.push_back(size * std::sin(0.7 * pace * static_cast<double>(frame)));
    }
    return move;
}

using Frame = std::function<Points(std::size_t)>;

/// The targets that belong to a move: the limb bulges where it bends.
Frame bulging(const Move& move, double bulge) {
    return [=](std::size_t frame) { return limb(move.bend[frame], move.twist[frame], bulge * move.bend[frame]); };
}

TargetFit fitOf(const Frame& skin, const Frame& cache, std::size_t count = frames) {
    quarn::FitInput input;
    input.vertices = vertices;
    input.diagonal = diagonal;
    input.rest = limb(0.0, 0.0, 0.0);
    input.skin = [&](std::size_t frame, Points& xyz) { xyz = skin(frame); };
    input.cache = [&](std::size_t frame, Points& xyz) { xyz = cache(frame); };
    input.frames = count;
    input.last = count - 1;
    input.reach = 20;
    return quarn::fitTarget(input);
}

TargetFit fitOf(const Move& move, const Frame& cache, std::size_t count = frames) {
    return fitOf(bulging(move, 0.0), cache, count);
}

quarn::FitContext context() {
    quarn::FitContext context;
    context.what = "limb.npy";
    context.startFrame = 5.0;
    context.canAlign = true;
    return context;
}

Frame changed(const Frame& frame, const std::function<quarn::FitPoint(double, double, double)>& change) {
    return [=](std::size_t number) {
        Points xyz = frame(number);
        for (std::size_t i = 0; i < xyz.size(); i += 3) {
            const quarn::FitPoint point = change(xyz[i], xyz[i + 1], xyz[i + 2]);
            std::copy(point.begin(), point.end(), xyz.begin() + static_cast<std::ptrdiff_t>(i));
        }
        return xyz;
    };
}

Frame shuffled(const Frame& frame) {
    std::vector<std::size_t> order(vertices);
    std::iota(order.begin(), order.end(), std::size_t{0});
    std::shuffle(order.begin(), order.end(), std::mt19937(3));
    return [=](std::size_t number) {
        const Points xyz = frame(number);
        Points mixed;
        for (const std::size_t vertex : order)
            mixed.insert(mixed.end(), {xyz[3 * vertex], xyz[3 * vertex + 1], xyz[3 * vertex + 2]});
        return mixed;
    };
}

Frame late(const Frame& frame, std::ptrdiff_t by) {
    return [=](std::size_t number) {
        return frame(static_cast<std::size_t>(
            std::clamp<std::ptrdiff_t>(static_cast<std::ptrdiff_t>(number) - by, 0, frames - 1)));
    };
}

const struct {
    const char* name;
    Move move;
} moves[] = {{"poses", poses(1)}, {"other poses", poses(2)}, {"a motion", swing(1.0, 0.25)}, {"slow", swing(0.3, 0.1)}};

// whatever the mistake, it is found, the flags say it, and what is left is the distance of the right targets
TEST(TargetFit, NamesEveryMistake) {
    struct Mistake {
        std::function<Frame(const Frame&)> make;
        std::vector<Cause> causes;
        std::string flags;
        const char* says;
    };
    const auto by = [](std::ptrdiff_t frame) { return [=](const Frame& right) { return late(right, frame); }; };
    const auto at = [](const std::function<quarn::FitPoint(double, double, double)>& change) {
        return [=](const Frame& right) { return changed(right, change); };
    };
    const auto scaled = [&](double factor) {
        return at([=](double x, double y, double z) { return quarn::FitPoint{factor * x, factor * y, factor * z}; });
    };
    using P = quarn::FitPoint;
    const Mistake mistakes[] = {
        {by(1), {Cause::shift}, "--start-frame 4", "it were one frame late"},
        {by(-3), {Cause::shift}, "--start-frame 8", "3 frames early"},
        {scaled(100), {Cause::place}, "--scale 0.01", "100 times too large (centimetres against metres)"},
        {scaled(0.001), {Cause::place}, "--scale 1000", "1000 times too small (metres against millimetres)"},
        {scaled(1 / 25.4), {Cause::place}, "--scale 25.4", "25.4 times too small (inches against millimetres)"},
        {at([](double x, double y, double z) {
             return P{x, -z, y};
         }),
         {Cause::place},
         "--axes z",
         "its z were up"},
        {at([](double x, double y, double z) {
             return P{x, z, -y};
         }),
         {Cause::place},
         "",
         "its y were up"},
        {at([](double x, double y, double z) {
             return P{y, z, x};
         }),
         {Cause::place},
         "",
         "its z, x, y were"},
        {at([](double x, double y, double z) {
             return P{-x, y, z};
         }),
         {Cause::place},
         "",
         "mirrored in x"},
        {at([](double x, double y, double z) {
             return P{y, x, z};
         }),
         {Cause::place},
         "",
         "z, which is mirrored"},
        {at([](double x, double y, double z) {
             return P{x - 3, y, z};
         }),
         {Cause::place},
         "",
         "beside the skin"},
        {at([](double x, double y, double z) {
             return P{100 * x, -100 * z, 100 * y};
         }),
         {Cause::place},
         "--axes z --scale 0.01",
         "its z were up, and the scene's y is, and as if its numbers were 100 times too large"},
        {shuffled, {Cause::order}, "--order rest", "another order"},
        {[&](const Frame& right) {
             return changed(late(right, 1), [](double x, double y, double z) { return P{x, -z, y}; });
         },
         {Cause::place, Cause::shift},
         "--axes z --start-frame 4",
         "its z were up, and the scene's y is, and as if it were one frame late"},
    };
    for (const auto& [name, move] : moves)
        for (const Mistake& mistake : mistakes) {
            SCOPED_TRACE(std::string(name) + ": " + mistake.says);
            const Frame right = bulging(move, 0.005);
            const double without = fitOf(move, right).asItIs.mean;
            const TargetFit fit = fitOf(move, mistake.make(right));
            EXPECT_EQ(fit.causes, mistake.causes);
            EXPECT_LT(fit.mended.mean, 1.5 * without);
            EXPECT_EQ(flagText(fit, context()), mistake.flags);
            const quarn::FitVerdict verdict = verdictOf(fit, context(), false);
            EXPECT_THAT(verdict.refusal + verdict.warning, HasSubstr(mistake.says));
            EXPECT_EQ(verdict.refusal.empty(), !isBeyondLimits(fit.asItIs, diagonal));
            EXPECT_EQ(verdictOf(fit, context(), true).refusal + verdictOf(fit, context(), true).warning, "");
        }
}

// corrections of up to a tenth of the limb, of any kind, in a cache of any length
TEST(TargetFit, RaisesNoFalseAlarm) {
    std::mt19937 random(4);
    std::normal_distribution<double> noise;
    const Frame rest = [](std::size_t) { return limb(0.0, 0.0, 0.0); };
    for (const auto& [name, move] : moves)
        for (const std::size_t count : {std::size_t{1}, std::size_t{2}, std::size_t{5}, frames})
            for (const double size : {0.0, 1e-4, 0.01, 0.04}) {
                SCOPED_TRACE(std::string(name) + ", " + std::to_string(count) + " frames, " + std::to_string(size));
                const auto noisy = [&](double x, double y, double z) {
                    const auto moved = [&](double at) { return at + size / 4 * std::clamp(noise(random), -2.0, 2.0); };
                    return quarn::FitPoint{moved(x), moved(y), moved(z)};
                };
                const auto lifted = [&](double x, double y, double z) { return quarn::FitPoint{x, y + size, z}; };
                const Frame right = bulging(move, 0.0);
                const Frame lazy = [&move = move, size](std::size_t frame) { // goes less far than the skin
                    return limb((1.0 - 5.0 * size) * move.bend[frame], move.twist[frame], 0.0);
                };
                for (const Frame& cache : {bulging(move, size), lazy, changed(right, noisy), changed(right, lifted)}) {
                    const TargetFit fit = fitOf(move, cache, count);
                    const quarn::FitVerdict verdict = verdictOf(fit, context(), false);
                    EXPECT_EQ(verdict.refusal, "");
                    EXPECT_NE(fit.motion.following, Following::no);
                    // all of a mesh in one direction is no correction that anybody wants, and is said
                    EXPECT_TRUE(verdict.warning.empty() || fit.change.offset != quarn::FitPoint{}) << verdict.warning;
                }
            }
}

// a face: the skin keeps still, or nearly, and only a part of it is ever away, by 8 % of the diagonal
TEST(TargetFit, TakesAFaceForOne) {
    for (const double nod : {0.0, 0.02}) {
        const Move move = swing(nod, 0.25);
        const Frame face = [&](std::size_t frame) {
            Points xyz = limb(move.bend[frame], move.twist[frame], 0.0);
            for (std::size_t i = 0; i < 3 * around * 4; i += 3)
                xyz[i + 1] -= 0.085 * std::abs(std::sin(0.4 * static_cast<double>(frame)));
            return xyz;
        };
        const TargetFit fit = fitOf(move, face);
        EXPECT_THAT(fit.causes, ElementsAre());
        const quarn::FitVerdict verdict = verdictOf(fit, context(), false);
        EXPECT_EQ(verdict.refusal + verdict.warning, "");
        EXPECT_THAT(verdict.note, HasSubstr("cannot be told: the skin moves too little"));
        EXPECT_GT(fit.asItIs.largest, 0.05 * diagonal);
    }
    // a loud frame and two quiet ones are no shift
    const Frame loud = [](std::size_t frame) { return limb(frame == 0 ? 0.3 : 0.0, 0.0, 1e-3); };
    EXPECT_THAT(fitOf(swing(0.0, 1.0), loud, 3).causes, ElementsAre());
}

TEST(TargetFit, TellsStrangers) {
    for (const unsigned seed : {2U, 3U, 4U, 5U, 6U})
        for (const Frame& cache : {bulging(poses(seed), 0.01), bulging(swing(0.8, 0.21 + 0.01 * seed), 0.01)}) {
            SCOPED_TRACE(seed);
            const TargetFit fit = fitOf(poses(1), cache);
            EXPECT_THAT(fit.causes, ElementsAre());
            const quarn::FitVerdict verdict = verdictOf(fit, context(), false);
            EXPECT_THAT(verdict.refusal + verdict.warning, HasSubstr("these frames do not belong to these poses"));
        }
    EXPECT_EQ(fitOf(poses(1), bulging(poses(2), 0.0), 4).motion.following, Following::untold) << "three are too few";
    // a cache that keeps still, a skin that does, and one that belongs and is far away
    const Frame still = [](std::size_t) { return limb(0.0, 0.0, 0.0); };
    EXPECT_THAT(verdictOf(fitOf(poses(1), still), context(), false).warning, HasSubstr("do not belong"));
    const Frame wide = changed(bulging(poses(1), 0.0), [](double x, double y, double z) {
        return quarn::FitPoint{1.7 * x, 1.7 * y, 1.7 * z};
    });
    EXPECT_THAT(verdictOf(fitOf(poses(1), wide), context(), false).refusal,
                HasSubstr("goes with the poses, but too far"));
}

TEST(TargetFit, SaysWhatFramesDoNotTell) {
    const auto note = [](const Move& move, double bulge) {
        return verdictOf(fitOf(move, bulging(move, bulge)), context(), false).note;
    };
    EXPECT_EQ(note(poses(1), 0.01), "");
    EXPECT_EQ(note(swing(1.0, 0.25), 0.002), "");
    EXPECT_THAT(note(swing(1.0, 0.02), 0.02),
                HasSubstr("too slow to tell whether the target is a frame early or late"));
    // so slow that neighbouring shifts are alike, or that a frame is a hint, and no more
    const Move slow = swing(1.0, 0.05);
    std::mt19937 random(7);
    const auto rough = [&](const Move& move, double size) {
        std::normal_distribution<double> noise(0.0, size);
        return changed(bulging(move, 0.0), [&, noise](double x, double y, double z) mutable {
            return quarn::FitPoint{x + noise(random), y + noise(random), z + noise(random)};
        });
    };
    EXPECT_THAT(verdictOf(fitOf(slow, late(rough(slow, 0.0018), 1)), context(), false).note,
                HasSubstr("early or late; with --start-frame 4 it would be"));
    const TargetFit fit = fitOf(slow, late(rough(slow, 0.01), 12));
    EXPECT_THAT(fit.causes, ElementsAre(Cause::shift));
    EXPECT_THAT(causeText(fit, context()), HasSubstr("about "));
    EXPECT_TRUE(fit.leastShift <= 12 && 12 <= fit.mostShift) << fit.leastShift << " to " << fit.mostShift;

    const Frame broken = [&](std::size_t frame) {
        Points xyz = limb(slow.bend[frame], slow.twist[frame], 0.0);
        xyz[30] = frame == 0 ? std::nan("") : xyz[30];
        return xyz;
    };
    EXPECT_THAT(verdictOf(fitOf(slow, broken), context(), false).warning, HasSubstr("vertex 10 of its frame 0"));
}

// forms that are the same are one, kinds that are not are none, and a pose at rest is found wherever it is
TEST(TargetFit, NamesOneOfSeveralOnlyWhereTheyAreTheSame) {
    const auto flat = [](double x, double y, double) { return quarn::FitPoint{x, y, 0.0}; };
    const Frame skin = changed(bulging(poses(1), 0.0), flat), right = changed(bulging(poses(1), 0.01), flat);
    const TargetFit turned = fitOf(skin, changed(right, [](double x, double y, double z) {
                                       return quarn::FitPoint{x, -z, y};
                                   }));
    EXPECT_EQ(flagText(turned, context()), "--axes z") << "and not one of its mirrors, which give the same";
    // at rest the limb is its own mirror, so that another order explains as much
    const Frame mirrored = changed(bulging(swing(0.0, 1.0), 0.0), [](double x, double y, double z) {
        return quarn::FitPoint{x, y, -z};
    });
    EXPECT_THAT(fitOf(swing(0.0, 1.0), mirrored).causes, ElementsAre());
    Move back = poses(1);
    std::reverse(back.bend.begin(), back.bend.end());
    std::reverse(back.twist.begin(), back.twist.end());
    EXPECT_EQ(flagText(fitOf(back, shuffled(bulging(back, 0.01))), context()), "--order rest --rest-frame 64");
}

// flags say what is to be given after those that were given
TEST(TargetFit, NamesFlagsAfterThoseThatWereGiven) {
    const Frame right = bulging(poses(1), 0.01);
    quarn::FitContext given = context();
    given.axes = quarn::fromZUp;
    given.scale = 0.01;
    const TargetFit fit = fitOf(poses(1), changed(right, [](double x, double y, double z) {
                                    return quarn::FitPoint{0.01 * x, 0.01 * z, -0.01 * y};
                                }));
    EXPECT_EQ(flagText(fit, given), "--axes y --scale 1");
}

} // namespace
