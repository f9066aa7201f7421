// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/smoothingStudy.h"

#include "quarn/dataset/ControlFit.h"
#include "quarn/dataset/DeltaCarriers.h"
#include "quarn/dataset/PosesInMotion.h"
#include "quarn/dataset/strictly.h"
#include "quarn/scene/ControlReader.h"
#include "quarn/scene/meshes.h"

#include "openquarn_app/Session.h"

#include <algorithm>
#include <cmath>
#include <numbers>
#include <optional>
#include <stdexcept>

namespace quarn {
namespace {

using Point = quill::val3<float>;
using Points = std::vector<Point>;

constexpr std::size_t mostFrames = 256; // every fourth of them is tested, the others are fitted
constexpr std::size_t mostVertices = 2048;
constexpr std::size_t pieces = 8;
constexpr std::size_t stepsOfAPiece = 24; // a second

std::vector<std::uint32_t> spreadVertices(std::size_t count) {
    std::vector<std::uint32_t> vertices(std::min(count, mostVertices));
    for (std::size_t k = 0; k < vertices.size(); ++k)
        vertices[k] = static_cast<std::uint32_t>(k * count / vertices.size());
    return vertices;
}

std::vector<float> pointsOf(const HPlug& mesh) {
    std::vector<float> xyz;
    readPoints(mesh, xyz);
    return xyz;
}

/// The scene at one time after another: what a frame has, for the vertices that are measured.
class StudiedFrame {
public:
    StudiedFrame(OpenQuarn::Session& host, const Warp& warp, const WarpGeometry& geometry,
                 const quill::IndexMapper& map, const std::vector<DeltaKind>& kinds)
        : host_(host)
        , geometry_(geometry)
        , full_(map.fullCount())
        , controls_(warp)
        , carriers_(polygonsOf(geometry.original), pointsOf(geometry.original), map, spreadVertices(map.affectCount()),
                    kinds) {}

    enum class With { skin, target };
    void go(double time, With with) {
        host_.setTime(time);
        strictly(static_cast<int>(time), [&] {
            controls_.read();
            if (controls_.names().empty())
                controls_.readNames();
            take(geometry_.input, "what comes into the deformer", skin_);
            carriers_.measure(xyz_);
            if (with == With::target)
                take(geometry_.target, "the target", target_);
        });
    }

    const std::vector<float>& controls() const { return controls_.values(); }
    const Points& skin() const { return skin_; }
    const Points& target() const { return target_; } ///< of the last frame that was gone to with its target
    const std::vector<DeltaCarrier>& carriers(std::size_t kind) const { return carriers_.of(kind); }

private:
    void take(const HPlug& mesh, const char* what, Points& points) {
        readPoints(mesh, xyz_);
        if (xyz_.size() < 3 * full_)
            throw std::runtime_error(std::string(what) + " has " + std::to_string(xyz_.size() / 3) + " vertices, and " +
                                     geometry_.name + " has " + std::to_string(full_));
        carriers_.pick(xyz_, points);
    }

    OpenQuarn::Session& host_;
    const WarpGeometry& geometry_;
    std::size_t full_;
    ControlReader controls_;
    DeltaCarriers carriers_;
    std::vector<float> xyz_;
    Points skin_, target_;
};

/// The deltas of frames, kind by kind, and what the controls tell of them.
class FittedDeltas {
public:
    explicit FittedDeltas(std::size_t kinds)
        : deltas_(kinds) {}

    void add(const StudiedFrame& frame) {
        rows_.push_back(frame.controls());
        for (std::size_t kind = 0; kind < deltas_.size(); ++kind)
            for (std::size_t k = 0; k < frame.target().size(); ++k)
                deltas_[kind].push_back(frame.carriers(kind)[k].deltaTo(frame.target()[k]));
    }
    void fit() { fit_.emplace(rows_); }

    /// After fit(): where the deltas of each kind lead to that these controls should have. place(kind, points).
    template <class Place>
    void predict(const StudiedFrame& frame, const Place& place) const {
        const std::vector<float> weights = fit_->weights(frame.controls());
        const std::size_t count = frame.skin().size();
        Points points;
        for (std::size_t kind = 0; kind < deltas_.size(); ++kind) {
            points.assign(count, {});
            for (std::size_t row = 0; row < weights.size(); ++row)
                for (std::size_t k = 0; k < count; ++k)
                    points[k] += weights[row] * deltas_[kind][row * count + k];
            for (std::size_t k = 0; k < count; ++k)
                points[k] = frame.carriers(kind)[k].place(points[k]);
            place(kind, points);
        }
    }

private:
    std::vector<std::vector<float>> rows_;
    std::vector<Points> deltas_; ///< [kinds][rows * vertices]
    std::optional<ControlFit> fit_;
};

/// The largest second difference of a vertex, in frames that follow one another.
class Jitter {
public:
    void begin() { seen_ = 0; }
    void add(const Points& points) {
        if (seen_ >= 2)
            for (std::size_t k = 0; k < points.size(); ++k)
                take(quill::length(points[k] - 2.0F * last_[k] + before_[k]));
        std::swap(before_, last_);
        last_ = points;
        ++seen_;
    }
    double largest() const { return largest_; }

private:
    void take(double length) {
        if (!(length <= largest_)) // what is no number stays none
            largest_ = length;
    }

    Points before_, last_;
    int seen_ = 0;
    double largest_ = 0.0;
};

/// The largest angle between a frame and the one before it.
class Turn {
public:
    void begin() { last_.clear(); }
    void add(const std::vector<DeltaCarrier>& carriers) {
        for (std::size_t k = 0; k < last_.size(); ++k)
            largest_ = std::max(largest_, degrees(last_[k], carriers[k]));
        last_ = carriers;
    }
    double largest() const { return largest_; }

private:
    // the trace of the rotation from one to the other is 1 + 2 cos
    static double degrees(const DeltaCarrier& a, const DeltaCarrier& b) {
        double trace = 0.0;
        for (std::size_t row = 0; row < 3; ++row)
            trace += static_cast<double>(quill::dot(a.turn[row], b.turn[row]));
        return std::acos(std::clamp((trace - 1.0) / 2.0, -1.0, 1.0)) * 180.0 / std::numbers::pi;
    }

    std::vector<DeltaCarrier> last_;
    double largest_ = 0.0;
};

double meanOf(const std::vector<double>& errors) {
    double sum = 0.0;
    for (const double error : errors)
        sum += error;
    return sum / static_cast<double>(errors.size());
}

double percentile99(std::vector<double> errors) {
    const auto place = errors.begin() + static_cast<std::ptrdiff_t>(errors.size() * 99 / 100);
    std::nth_element(errors.begin(), place, errors.end());
    return *place;
}

class Study {
public:
    Study(StudiedFrame& frame, const FrameRange& frames, const std::vector<DeltaKind>& kinds)
        : frame_(frame)
        , frames_(frames)
        , looked_(std::min(mostFrames, frames.count()))
        , deltas_(kinds.size()) {
        for (const DeltaKind& kind : kinds)
            study_.kinds.push_back({kind});
    }

    SmoothingStudy run(const Console& console) {
        Progress progress(console, "comparing kinds of deltas", looked_ + pieces * (stepsOfAPiece + 1));
        eachLooked(false, [&] {
            deltas_.add(frame_);
            ++study_.fitted;
            progress.advance();
        });
        deltas_.fit();
        test(progress);
        walk(progress);
        return study_;
    }

private:
    template <class Look>
    void eachLooked(bool isTested, const Look& look) {
        for (std::size_t i = 0; i < looked_; ++i)
            if ((i % 4 == 3) == isTested) {
                frame_.go(frames_.frame(i * frames_.count() / looked_), StudiedFrame::With::target);
                look();
            }
    }

    void test(Progress& progress) {
        std::vector<std::vector<double>> errors(study_.kinds.size());
        eachLooked(true, [&] {
            deltas_.predict(frame_, [&](std::size_t kind, const Points& points) {
                for (std::size_t k = 0; k < points.size(); ++k)
                    errors[kind].push_back(quill::length(points[k] - frame_.target()[k]));
            });
            ++study_.tested;
            progress.advance();
        });
        for (std::size_t kind = 0; kind < errors.size(); ++kind) {
            study_.kinds[kind].mean = meanOf(errors[kind]);
            study_.kinds[kind].p99 = percentile99(std::move(errors[kind]));
        }
    }

    void walk(Progress& progress) {
        const PosesInMotion motion;
        const std::size_t reach = motion.any() ? 1 : std::min(stepsOfAPiece, frames_.count() - 1);
        std::vector<Jitter> jitter(study_.kinds.size());
        std::vector<Turn> turn(study_.kinds.size());
        for (std::size_t piece = 0; piece < pieces; ++piece) {
            const std::size_t first = piece * (frames_.count() - 1 - reach) / (pieces - 1);
            for (std::size_t kind = 0; kind < jitter.size(); ++kind) {
                jitter[kind].begin();
                turn[kind].begin();
            }
            walkFrom(frames_.frame(first), frames_.frame(first + reach), progress,
                     [&](std::size_t kind, Points& points) {
                         for (std::size_t k = 0; k < points.size(); ++k)
                             points[k] -= frame_.skin()[k];
                         jitter[kind].add(points);
                         turn[kind].add(frame_.carriers(kind));
                     });
        }
        for (std::size_t kind = 0; kind < jitter.size(); ++kind) {
            study_.kinds[kind].jitter = jitter[kind].largest();
            study_.kinds[kind].turn = turn[kind].largest();
        }
    }

    template <class Place>
    void walkFrom(int first, int last, Progress& progress, const Place& place) {
        for (std::size_t step = 0; step <= stepsOfAPiece; ++step) {
            frame_.go(first + static_cast<double>(last - first) * static_cast<double>(step) / stepsOfAPiece,
                      StudiedFrame::With::skin);
            deltas_.predict(frame_, place);
            ++study_.steps;
            progress.advance();
        }
    }

    StudiedFrame& frame_;
    FrameRange frames_;
    std::size_t looked_;
    FittedDeltas deltas_;
    SmoothingStudy study_;
};

} // namespace

SmoothingStudy studySmoothing(OpenQuarn::Session& host, const Warp& warp, const WarpGeometry& geometry,
                              const quill::IndexMapper& map, const FrameRange& frames,
                              const std::vector<DeltaKind>& kinds, const Console& console) {
    StudiedFrame frame(host, warp, geometry, map, kinds);
    return Study(frame, frames, kinds).run(console);
}

} // namespace quarn
