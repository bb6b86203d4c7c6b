#pragma once

#include <cstddef>
#include <vector>

#include "scene/EulerRotation.h"

// Chooses which of a sampled curve's points to write so that the written pieces (straight lines,
// or spherical ones for quaternions) stay within a tolerance of every point. The points are at
// `times` (seconds, ascending, distinct once stored as floats); the first and the last are
// always kept. Pieces run between the stored (float) times of their ends, as a player reads
// them, and every point is checked at its own exact time against the piece that holds it.
class SampleReducer {
  public:
    SampleReducer(const std::vector<double>& times, double tolerance)
        : times_(times), tolerance_(tolerance) {}

    // Straight pieces through one or more axes at once (each `axes[a][k]` the value of axis a at
    // point k's exact time, `ends[a][k]` its value at the stored time, which a piece ending
    // there carries): every point lies within the tolerance of the pieces on every axis. With
    // `storedValues` the ends carry their values rounded to floats, as they are written; a piece
    // never changes an axis by `maxChange` or more. Greedy: each piece reaches the farthest point
    // that fits, found in one pass over the points it covers (the slopes that keep every point
    // so far within the tolerance narrow to an interval as the piece grows).
    std::vector<size_t> Lines(const std::vector<const std::vector<double>*>& axes,
                              const std::vector<const std::vector<double>*>& ends,
                              bool storedValues, double maxChange) const;
    // Spherical pieces between unit quaternions (as players interpolate rotations), the
    // tolerance being the angle in degrees between the written rotation and each point's.
    // `q` at each point's exact time, `ends` at its stored time.
    std::vector<size_t> Slerps(const std::vector<EulerRotation::Quat>& q,
                               const std::vector<EulerRotation::Quat>& ends) const;

  private:
    template <size_t W>
    std::vector<size_t> lines(const std::vector<double>* const* axes,
                              const std::vector<double>* const* ends, bool storedValues,
                              double maxChange) const;
    bool slerpFits(const std::vector<EulerRotation::Quat>& q,
                   const std::vector<EulerRotation::Quat>& ends, size_t i, size_t j,
                   double chord) const;

    const std::vector<double>& times_;
    double tolerance_;
};
