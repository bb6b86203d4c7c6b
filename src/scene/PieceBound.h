#pragma once

// How many equal parts a cubic quaternion piece needs to stay within a tolerance of a rotation
// whose Euler half-angles run along cubics over the piece. The rotation is the product of one
// turn per axis, exp(h(u) e) for the axis e and half-angle h, so the size of its fourth
// derivative is bounded by that of the exponential of the half-angles' summed derivative bounds
// (A⁴ + 6A²B + 3B² + 4AC for bounds A, B, C on the first three derivatives), and a cubic
// Hermite piece misses by at most a 384th of that. Each cut into n parts brings the bound down
// by about n⁴.
class PieceBound {
  public:
    // More parts than this for one piece and the rotation is left to sampling.
    static constexpr int kMaxParts = 16;

    // Adds one axis's half-angle over the piece (radians): from p0 to p1, with slopes m0 and m1
    // in radians per piece (the slope per second times the piece's duration).
    void Add(double p0, double p1, double m0, double m1);

    // The parts the piece from time t0 to t1 (seconds) needs to stay within `allowedRadians`
    // of the rotation, allowing for its knots' times being stored as floats; 0 when no number
    // up to kMaxParts will do. With `oneAxis` (only one half-angle was added, between fixed
    // rotations) only the error across the rotation's path counts, which is the smaller.
    int Parts(double t0, double t1, double allowedRadians, bool oneAxis) const;

  private:
    double first_ = 0, second_ = 0, third_ = 0;  // summed bounds, by u over the piece
};
