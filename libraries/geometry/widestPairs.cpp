// SPDX-License-Identifier: Apache-2.0
// Branch and bound over pairs of balls (A. H. Land, A. G. Doig, "An automatic method of solving discrete programming
// problems", 1960): a ball holds corners that lie near each other, and two balls are looked into only when some pair of
// theirs may span as much as the best pair so far (decision 0122).
#include "widestPairs.h"

#include "quill/parallelFor.h"

#include <tbb/task_arena.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <cmath>
#include <functional>
#include <limits>
#include <numeric>
#include <utility>

namespace quill {
namespace {

using Vector = val3<double>;

// Pairs are scored so many at a time, in vector code. A circle of 4096 takes 0.30 s of one core; 0.40 with 8, 0.45
// with 32.
constexpr std::uint32_t leafSize = 16;
// Up to here a tree is not worth its making: it halves the time for 32 corners, and doubles it for 16.
constexpr std::size_t fewCorners = 20;
// The cancelled flag is looked at this often: about every tenth of a millisecond.
constexpr unsigned leafPairsPerLook = 1024;
// From here on the user is told beforehand: some seconds.
constexpr double manyPairs = 1e10;

// What a score in floats may be above the exact area, relative to |a||b|: 1.2e-7 from the differences of the points,
// and 3.3e-7 from cross product and length (unit roundoff 6e-8, by Higham's "Accuracy and Stability of Numerical
// Algorithms", 3.1); the rest is for the points' own way into a ball.
constexpr double relativeMargin = 2e-6;
// The same where squares are denormal numbers: the root of a few times 1.4e-45.
constexpr double absoluteMargin = 1e-22;
// Above, squares of floats may be infinite, and so may a score be.
constexpr double safeArea = 1e18;
constexpr double safeCoordinate = 1e18;

// A node of the tree: corners begin .. end of its order. A leaf has no right child; the left one comes next.
struct Ball {
    Vector center;
    double radius = 0.0; // infinite or NaN where a corner is no ordinary point: nothing is then known of the ball
    std::uint32_t begin = 0, end = 0;
    std::uint32_t right = 0;
    bool isLeaf() const { return right == 0; }
};

// The best pair so far, by score, then by order.
struct Best {
    float score = -1.0F;
    std::size_t j = 0, k = 0; // steps from the corner, 0 < j < k < m

    void offer(float newScore, std::size_t newJ, std::size_t newK) {
        if (newScore > score || (newScore == score && std::pair(newJ, newK) < std::pair(j, k)))
            *this = {newScore, newJ, newK};
    }
};

// How long a search has taken, and when it ends.
struct Effort {
    double pairs = 0.0;
    double limit = std::numeric_limits<double>::infinity();
    unsigned leafPairs = 0;
    bool isStopped = false;
};

// The corners of one polygon, and the tree over them.
class Polygon {
public:
    Polygon(std::span<const std::uint32_t> corners, const std::vector<val3<float>>& positions)
        : order_(corners.size()) {
        points_.reserve(corners.size());
        for (const std::uint32_t corner : corners)
            points_.push_back(positions[corner]);
        std::iota(order_.begin(), order_.end(), 0U);
        balls_.reserve(4 * corners.size() / leafSize + 1);
        add(0, static_cast<std::uint32_t>(corners.size()));
    }

    std::size_t size() const { return points_.size(); }
    const val3<float>& point(std::size_t c) const { return points_[c]; }
    const std::vector<Ball>& balls() const { return balls_; }
    // Where corner t of the tree's order is in the polygon.
    std::size_t place(std::size_t t) const { return order_[t]; }

private:
    std::uint32_t add(std::uint32_t begin, std::uint32_t end) {
        const auto number = static_cast<std::uint32_t>(balls_.size());
        balls_.push_back(ballOf(begin, end));
        if (end - begin <= leafSize)
            return number;
        // in halves along the longest side of the box, each of whole leaves
        const std::uint32_t half = (end - begin + 2 * leafSize - 1) / (2 * leafSize) * leafSize;
        const std::size_t axis = longestAxis(begin, end);
        const auto key = [&](std::uint32_t c) {
            const float x = points_[c][axis];
            return std::isnan(x) ? std::numeric_limits<float>::infinity() : x; // an order must be one
        };
        std::nth_element(order_.begin() + begin, order_.begin() + begin + half, order_.begin() + end,
                         [&](std::uint32_t a, std::uint32_t b) { return key(a) < key(b); });
        add(begin, begin + half);
        balls_[number].right = add(begin + half, end);
        return number;
    }

    struct Box {
        Vector low, high;
    };
    Box boxOf(std::uint32_t begin, std::uint32_t end) const {
        constexpr double infinity = std::numeric_limits<double>::infinity();
        Box box{{infinity, infinity, infinity}, {-infinity, -infinity, -infinity}};
        for (std::uint32_t t = begin; t < end; ++t)
            for (std::size_t axis = 0; axis < 3; ++axis) {
                const double x = points_[order_[t]][axis];
                box.low[axis] = std::min(box.low[axis], x);
                box.high[axis] = std::max(box.high[axis], x);
            }
        return box;
    }
    std::size_t longestAxis(std::uint32_t begin, std::uint32_t end) const {
        const Box box = boxOf(begin, end);
        const Vector sides = box.high - box.low;
        return sides.x >= sides.y && sides.x >= sides.z ? 0 : sides.y >= sides.z ? 1 : 2;
    }
    Ball ballOf(std::uint32_t begin, std::uint32_t end) const {
        const Box box = boxOf(begin, end);
        Ball ball{(box.low + box.high) / 2.0, 0.0, begin, end};
        bool isOrdinary = true;
        for (std::uint32_t t = begin; t < end; ++t) {
            const val3<float>& p = points_[order_[t]];
            for (std::size_t axis = 0; axis < 3; ++axis)
                isOrdinary = isOrdinary && std::abs(p[axis]) <= safeCoordinate;
            ball.radius = std::max(ball.radius, length(Vector(p.x, p.y, p.z) - ball.center));
        }
        if (!isOrdinary)
            ball.radius = std::numeric_limits<double>::infinity();
        return ball;
    }

    std::vector<val3<float>> points_;  // in the polygon's order
    std::vector<std::uint32_t> order_; // the tree's
    std::vector<Ball> balls_;
};

// Searches of the corners of one polygon, one after the other, on one thread.
class Search {
public:
    Search(const Polygon& polygon, const std::function<bool()>& isStopped)
        : polygon_(polygon)
        , isStopped_(isStopped)
        , seen_(polygon.balls().size()) {
        for (auto& axis : toCorner_)
            axis.resize(polygon.size() + leafSize); // a leaf is read to its full width
    }

    // The best pair of corner c; not to be used when `effort` was stopped.
    Best widest(std::size_t c, Effort& effort) {
        lookFrom(c);
        const std::size_t m = polygon_.size();
        best_ = {};
        effort_ = &effort;
        effort.isStopped = isStopped_ && isStopped_();
        best_.offer(2.0F * scoreOf(1, m - 1), 1, m - 1);
        offer(1, 2); // the first of all, should they be equal
        // the polygon's next corner has a similar pair, or the same
        if (last_.k != 0) {
            offer(last_.j, last_.k);
            offer((last_.j + m - 1) % m, (last_.k + m - 1) % m);
        }
        visit(0, 0);
        last_ = best_;
        return best_;
    }

private:
    // A ball as the corner sees it.
    struct Seen {
        Vector center;
        double distance, radius;
    };

    void lookFrom(std::size_t c) {
        corner_ = c;
        const val3<float> here = polygon_.point(c);
        for (std::size_t t = 0; t < polygon_.size(); ++t) {
            const val3<float> to = polygon_.point(polygon_.place(t)) - here;
            for (std::size_t axis = 0; axis < 3; ++axis)
                toCorner_[axis][t] = to[axis];
        }
        for (std::size_t b = 0; b < seen_.size(); ++b) {
            const Ball& ball = polygon_.balls()[b];
            const Vector to = ball.center - Vector(here.x, here.y, here.z);
            seen_[b] = {to, length(to), ball.radius};
        }
    }

    float scoreOf(std::size_t j, std::size_t k) const {
        const std::size_t m = polygon_.size();
        const val3<float> here = polygon_.point(corner_);
        return length(cross(polygon_.point((corner_ + j) % m) - here, polygon_.point((corner_ + k) % m) - here));
    }
    void offer(std::size_t j, std::size_t k) {
        if (j > k)
            std::swap(j, k);
        if (j != 0 && j != k)
            best_.offer(scoreOf(j, k), j, k);
    }

    // Above the score of every pair of the two balls: |(a + u) x (b + w)| <= |a x b| + |u||b| + |a||w| + |u||w|.
    double bound(std::uint32_t first, std::uint32_t second) const {
        const Seen& a = seen_[first];
        const Seen& b = seen_[second];
        const double area = length(cross(a.center, b.center)) + a.radius * b.distance + a.distance * b.radius +
                            a.radius * b.radius + absoluteMargin +
                            relativeMargin * (a.distance + a.radius) * (b.distance + b.radius);
        return area < safeArea ? area : std::numeric_limits<double>::infinity();
    }
    // A pair as good as the best one may come before it: equals are not pruned.
    bool isHopeless(double bound) const { return bound < static_cast<double>(best_.score); }

    void visit(std::uint32_t first, std::uint32_t second) {
        if (effort_->isStopped)
            return;
        const Ball& a = polygon_.balls()[first];
        const Ball& b = polygon_.balls()[second];
        if (a.isLeaf() && b.isLeaf())
            return scoreLeaves(a, b);
        const bool splitsFirst = b.isLeaf() || (!a.isLeaf() && a.radius >= b.radius);
        if (first == second)
            visitAll<3>({{{first + 1, first + 1}, {first + 1, a.right}, {a.right, a.right}}});
        else if (splitsFirst)
            visitAll<2>({{{first + 1, second}, {a.right, second}}});
        else
            visitAll<2>({{{first, second + 1}, {first, b.right}}});
    }

    // The most promising first: what it finds prunes the others.
    struct Visit {
        std::uint32_t first, second;
        double bound = 0.0;
    };
    template <std::size_t N>
    void visitAll(std::array<Visit, N> visits) {
        for (std::size_t i = 0; i < N; ++i) {
            visits[i].bound = bound(visits[i].first, visits[i].second);
            for (std::size_t at = i; at > 0 && visits[at].bound > visits[at - 1].bound; --at)
                std::swap(visits[at], visits[at - 1]);
        }
        for (const Visit& next : visits)
            if (!isHopeless(next.bound))
                visit(next.first, next.second);
    }

    void scoreLeaves(const Ball& a, const Ball& b) {
        for (std::uint32_t t = a.begin; t < a.end; ++t)
            scoreLeaf(t, b);
        effort_->pairs += static_cast<double>((a.end - a.begin) * (b.end - b.begin));
        if (++effort_->leafPairs % leafPairsPerLook == 0)
            effort_->isStopped = effort_->pairs > effort_->limit || (isStopped_ && isStopped_());
    }

    // The pairs of one corner with a leaf's. What lies beyond the leaf's end are other corners: they do no harm.
    void scoreLeaf(std::uint32_t t, const Ball& leaf) {
        const auto& [x, y, z] = toCorner_;
        const float ax = x[t], ay = y[t], az = z[t];
        const float* bx = x.data() + leaf.begin;
        const float* by = y.data() + leaf.begin;
        const float* bz = z.data() + leaf.begin;
        const float worthARoot = smallestSquareOfUse();
        std::array<float, leafSize> squares;
        bool isAnyWorth = false;
        for (std::size_t lane = 0; lane < leafSize; ++lane) {
            const float cx = ay * bz[lane] - az * by[lane];
            const float cy = az * bx[lane] - ax * bz[lane];
            const float cz = ax * by[lane] - ay * bx[lane];
            squares[lane] = cx * cx + cy * cy + cz * cz;
        }
        for (const float square : squares)
            isAnyWorth |= square >= worthARoot;
        if (isAnyWorth)
            offerLeaf(t, leaf, squares);
    }

    // A square below it has a root below the best score, whatever the rounding of either.
    float smallestSquareOfUse() const {
        if (best_.score > 0.0F)
            return best_.score * best_.score * (1.0F - 1e-6F);
        // nothing comes before the first pair
        return best_.score == 0.0F && best_.j == 1 && best_.k == 2 ? std::numeric_limits<float>::denorm_min() : 0.0F;
    }

    void offerLeaf(std::uint32_t t, const Ball& leaf, const std::array<float, leafSize>& squares) {
        const std::size_t first = stepsTo(t);
        for (std::uint32_t other = leaf.begin; other < leaf.end; ++other) {
            const std::size_t second = stepsTo(other);
            const float score = std::sqrt(squares[other - leaf.begin]);
            if (first != 0 && second != 0 && first != second)
                best_.offer(score, std::min(first, second), std::max(first, second));
        }
    }
    std::size_t stepsTo(std::uint32_t t) const {
        const std::size_t place = polygon_.place(t);
        return place >= corner_ ? place - corner_ : place + polygon_.size() - corner_;
    }

    const Polygon& polygon_;
    const std::function<bool()>& isStopped_;
    std::size_t corner_ = 0;
    Best best_, last_;
    Effort* effort_ = nullptr;
    std::array<std::vector<float>, 3> toCorner_; // by axis, in the tree's order
    std::vector<Seen> seen_;
};

// Seconds that all corners take on one thread, at most, as a few of them tell; and pairs.
struct Forecast {
    double pairs = 0.0, seconds = 0.0;
};

Forecast forecast(const Polygon& polygon, const std::function<bool()>& isStopped) {
    constexpr std::size_t probes = 8;
    const auto m = static_cast<double>(polygon.size());
    const double all = m * m / 2.0;
    Search search(polygon, isStopped);
    Forecast sum;
    for (std::size_t i = 0; i < probes; ++i) {
        Effort effort;
        effort.limit = std::min(all / 4.0, 4e6); // some milliseconds
        const auto start = std::chrono::steady_clock::now();
        search.widest(i * polygon.size() / probes, effort);
        const std::chrono::duration<double> spent = std::chrono::steady_clock::now() - start;
        const double scale = effort.isStopped ? all / effort.pairs : 1.0; // it may have to look at all of them
        sum.pairs += effort.pairs * scale * m / probes;
        sum.seconds += spent.count() * scale * m / probes;
    }
    return sum;
}

} // namespace

void widestPairs(std::span<const std::uint32_t> corners, const std::vector<val3<float>>& positions,
                 std::vector<CornerPair>& pairs, std::size_t number, const WorkWatch& watch) {
    const std::size_t m = corners.size();
    pairs.resize(m);
    if (m <= fewCorners) {
        for (std::size_t c = 0; c < m; ++c)
            pairs[c] = widestPair(corners, c, positions);
        return;
    }
    const Polygon polygon(corners, positions);
    if (const double all = static_cast<double>(m) * static_cast<double>(m) / 2.0 * static_cast<double>(m);
        watch.onSlowPolygon && all >= manyPairs) {
        const Forecast expected = forecast(polygon, watch.isCancelled);
        if (expected.pairs >= manyPairs)
            watch.onSlowPolygon(number, m, expected.seconds / tbb::this_task_arena::max_concurrency());
    }
    std::atomic<bool> isCancelled{false};
    parallelForRange(m, [&](int begin, int end) {
        Search search(polygon, watch.isCancelled);
        for (auto c = static_cast<std::size_t>(begin); c < static_cast<std::size_t>(end); ++c) {
            Effort effort;
            const Best best = search.widest(c, effort);
            isCancelled = isCancelled || effort.isStopped;
            if (isCancelled)
                return;
            pairs[c] = best.k == 0 ? adjacentPair(corners, c)
                                   : CornerPair{corners[(c + best.j) % m], corners[(c + best.k) % m]};
        }
    });
    if (isCancelled)
        throw Cancelled();
}

} // namespace quill
