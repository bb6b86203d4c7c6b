#include "scene/SampleReducer.h"

#include <algorithm>
#include <cmath>

namespace {
// A time or value as a float holds it, back in double.
double as_stored(double v) {
    return double(float(v));
}

// Few of the points 0..n-1 (first and last always among them) such that every point between
// two kept ones fits the piece between them: `piece_fits(i, j)` says whether the points from i
// to j fit the piece from i to j. Each piece is grown by doubling and then narrowed by
// bisection, so the cost is about n log n point checks for long pieces.
template <class PieceFits>
std::vector<size_t> grow_and_bisect(size_t n, const PieceFits& piece_fits) {
    std::vector<size_t> kept;
    if (n == 0) {
        return kept;
    }
    size_t i = 0;
    kept.push_back(0);
    while (i + 1 < n) {
        size_t good = i + 1, step = 2;
        size_t bad = n;  // first end known not to fit (n: none)
        while (true) {
            size_t j = std::min(n - 1, i + step);
            if (j == good) {
                break;
            }
            if (piece_fits(i, j)) {
                good = j;
                if (j == n - 1) {
                    break;
                }
                step *= 2;
            } else {
                bad = j;
                break;
            }
        }
        while (bad < n && bad - good > 1) {
            size_t mid = good + (bad - good) / 2;
            if (piece_fits(i, mid)) {
                good = mid;
            } else {
                bad = mid;
            }
        }
        kept.push_back(good);
        i = good;
    }
    return kept;
}
}  // namespace

std::vector<size_t> SampleReducer::Lines(const std::vector<const std::vector<double>*>& axes,
                                         const std::vector<const std::vector<double>*>& ends,
                                         bool storedValues, double maxChange) const {
    switch (std::min(axes.size(), ends.size())) {
        case 1:
            return lines<1>(axes.data(), ends.data(), storedValues, maxChange);
        case 2:
            return lines<2>(axes.data(), ends.data(), storedValues, maxChange);
        case 3:
            return lines<3>(axes.data(), ends.data(), storedValues, maxChange);
        default:
            return lines<0>(axes.data(), ends.data(), storedValues, maxChange);
    }
}

template <size_t W>
std::vector<size_t> SampleReducer::lines(const std::vector<double>* const* axes,
                                         const std::vector<double>* const* ends, bool storedValues,
                                         double maxChange) const {
    const size_t n = times_.size();
    std::vector<size_t> kept;
    if (n == 0) {
        return kept;
    }
    kept.reserve(n / 2 + 2);
    kept.push_back(0);
    if (W == 0) {
        // Nothing moves: the ends hold it all.
        if (n > 1) {
            kept.push_back(n - 1);
        }
        return kept;
    }
    std::vector<double> storedTimes(n);
    for (size_t k = 0; k < n; ++k) {
        storedTimes[k] = as_stored(times_[k]);
    }
    constexpr size_t kSlots = W > 0 ? W : 1;
    const double *v[kSlots], *e[kSlots];
    for (size_t a = 0; a < W; ++a) {
        v[a] = axes[a]->data();
        e[a] = ends[a]->data();
    }
    // Per axis: the anchor's written value, and the slopes from it that keep every point so far
    // within the tolerance.
    double start[kSlots], low[kSlots], high[kSlots];
    const double tol = tolerance_;
    size_t i = 0;
    while (i + 1 < n) {
        const double t0 = storedTimes[i];
        // The anchor's own exact time lies on this piece when it falls after the stored one.
        const double late = times_[i] - t0;
        for (size_t a = 0; a < W; ++a) {
            start[a] = storedValues ? as_stored(e[a][i]) : e[a][i];
            low[a] = late > 0 ? (v[a][i] - tol - start[a]) / late : -HUGE_VAL;
            high[a] = late > 0 ? (v[a][i] + tol - start[a]) / late : HUGE_VAL;
        }
        size_t best = i + 1;
        for (size_t k = i + 1; k < n; ++k) {
            const double exact = times_[k] - t0, span = storedTimes[k] - t0;
            const double perExact = 1 / exact, perSpan = 1 / span;
            const bool onPiece = exact <= span;
            bool fits = true, open = true;
            for (size_t a = 0; a < W; ++a) {
                const double value = v[a][k], rise = value - start[a];
                const double end = storedValues ? as_stored(e[a][k]) : e[a][k];
                const double slope = (end - start[a]) * perSpan;
                // As the end: within the slopes the points before allow, and the point itself
                // within the tolerance at its exact time when that is still on this piece.
                fits = fits && slope >= low[a] && slope <= high[a] &&
                       std::fabs(end - start[a]) < maxChange &&
                       (!onPiece || std::fabs(slope * exact - rise) <= tol);
                // As a point inside a longer piece.
                low[a] = std::max(low[a], (rise - tol) * perExact);
                high[a] = std::min(high[a], (rise + tol) * perExact);
                open = open && low[a] <= high[a] && std::fabs(rise) < maxChange;
            }
            if (fits) {
                best = k;
            }
            if (!open) {
                break;
            }
        }
        kept.push_back(best);
        i = best;
    }
    return kept;
}

std::vector<size_t> SampleReducer::Slerps(const std::vector<EulerRotation::Quat>& q,
                                          const std::vector<EulerRotation::Quat>& ends) const {
    const double chord = 2 * std::sin(tolerance_ * 3.14159265358979323846 / 180 / 4);
    return grow_and_bisect(times_.size(),
                           [&](size_t i, size_t j) { return slerpFits(q, ends, i, j, chord); });
}

// Whether q[k] for every point from i to j that the piece holds lies within `chord` (the chord
// between unit quaternions of the tolerance angle) of the spherical interpolation from q[i] to
// q[j] between their stored times.
bool SampleReducer::slerpFits(const std::vector<EulerRotation::Quat>& q,
                              const std::vector<EulerRotation::Quat>& ends, size_t i, size_t j,
                              double chord) const {
    const EulerRotation::Quat& a = ends[i];
    const EulerRotation::Quat& b = ends[j];
    double dot = a[0] * b[0] + a[1] * b[1] + a[2] * b[2] + a[3] * b[3];
    double sign = dot < 0 ? -1.0 : 1.0;
    dot *= sign;
    // Between quaternions less than 0.01 radians apart the normalised straight line misses the
    // spherical one by under 1e-5 degrees, far inside the margin: no sines needed.
    double angle = dot < 0.99995 ? std::acos(dot) : 0.0, s = angle > 0 ? std::sin(angle) : 0.0;
    const double t0 = as_stored(times_[i]), t1 = as_stored(times_[j]), per = 1 / (t1 - t0);
    // For unit x and q, min(|x - q|^2, |x + q|^2) = 2 - 2|x.q| <= chord^2 is |x.q| >= cosine;
    // with x = m / |m|, (m.q)^2 >= cosine^2 |m|^2: no square root or division per point.
    const double cosine = 1 - chord * chord / 2, cosine2 = cosine * cosine;
    double sb[4];
    for (size_t c = 0; c < 4; ++c) {
        sb[c] = sign * b[c];
    }
    for (size_t k = i; k <= j; ++k) {
        if (times_[k] < t0 || times_[k] > t1) {
            continue;  // held by the piece before or after
        }
        const double u = (times_[k] - t0) * per;
        double wa = 1 - u, wb = u;
        if (angle > 0) {
            wa = std::sin((1 - u) * angle) / s;
            wb = std::sin(u * angle) / s;
        }
        double mm = 0, mq = 0;
        for (size_t c = 0; c < 4; ++c) {
            const double m = wa * a[c] + wb * sb[c];
            mm += m * m;
            mq += m * q[k][c];
        }
        if (mq * mq < cosine2 * mm) {
            return false;
        }
    }
    return true;
}
