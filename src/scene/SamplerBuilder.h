#pragma once

#include <string>
#include <vector>

class ChannelCurve;

// One glTF animation sampler as it is written: key times in seconds and, per key, `width`
// floats (three times as many for CUBICSPLINE: in-tangent, value, out-tangent). The values are
// held as bytes, so that a store can hand them to a buffer of the file without a copy.
struct BuiltSampler {
    std::string interpolation = "LINEAR";
    std::vector<float> times;
    std::vector<unsigned char> valueBytes;
    int width = 3;

    // Makes room for `count` values and returns where they go.
    float* SizeValues(size_t count) {
        valueBytes.resize(count * sizeof(float));
        return reinterpret_cast<float*>(valueBytes.data());
    }
    // Makes room for `knots` CUBICSPLINE quaternion knots (times, and in-tangent, value and
    // out-tangent each) and returns where their values go.
    float* SizeQuaternionKnots(size_t knots) {
        interpolation = "CUBICSPLINE";
        width = 4;
        times.resize(knots);
        return SizeValues(knots * 12);
    }
    const float* Values() const { return reinterpret_cast<const float*>(valueBytes.data()); }
    // A time or value as it is written: a float, a negative zero written as zero.
    static float Stored(double v) { return float(v) + 0.0f; }
    size_t ValueCount() const { return valueBytes.size() / sizeof(float); }
};

// Builds the sampler of one node path (translation, rotation or scale) from the key curves of
// its three axes. An axis whose curve holds one value throughout counts as unanimated at that
// value (its key times are not needed) unless no axis moves. What is written how:
//   - translation or scale whose animated axes share their key times: the keys themselves,
//     LINEAR when every segment is a straight line, STEP when every one is a step, else
//     CUBICSPLINE with the keys' slopes (exact);
//   - translation or scale whose axes are keyed at different times, without steps: CUBICSPLINE
//     at the union of the key times, each piece cut from the axis's own cubic (exact);
//   - rotation turning about one axis between fixed ones, without steps: CUBICSPLINE
//     quaternions at that axis's keys, a piece cut into equal parts where a bound on its error
//     exceeds kRotationToleranceDegrees (see TurnSpline);
//   - rotation turning about more axes, without steps: the same at the union of the axes' key
//     times (see EulerSpline), unless that needs more knots than the frames and keys sampling
//     would look at (samples then make the smaller file);
//   - any other rotation (one that steps, or that float times would move too far), and
//     translation or scale mixing steps with axes keyed at different times: LINEAR samples
//     taken from the keys and the whole frames between them, reduced to few that keep the
//     written curve within kVectorTolerance (units) or kRotationToleranceDegrees (the angle
//     between the rotations) of the evaluated curve at every key and every frame, with the
//     pieces running between the samples' stored (float) times. Spans where every axis holds
//     still, or where the moving axes run in straight lines that the pieces follow exactly
//     (translation and scale; a rotation turning about one axis by less than a quarter turn),
//     get no samples inside.
// A curve is never sampled before its first or after its last key; one whose keys would make it
// need more than kMaxSampledFrames frames sampled is refused.
class SamplerBuilder {
  public:
    static constexpr double kVectorTolerance = 1e-4;
    static constexpr double kRotationToleranceDegrees = 1e-3;
    static constexpr size_t kMaxSampledFrames = 2000000;

    // `curves` are the three axes (null for an unanimated axis, which holds `rest`); `fps` the
    // frame rate whose frames are sampled. The curves are borrowed.
    SamplerBuilder(const ChannelCurve* const curves[3], const double rest[3], int fps);

    // Nothing to write when no axis is animated.
    bool Animated() const { return lead_ != nullptr; }
    // Each false with `why` set when the curve would need too many samples.
    bool BuildVector(BuiltSampler* out, std::string* why) const;
    bool BuildRotation(BuiltSampler* out, std::string* why) const;

  private:
    bool sharedTimes() const;
    void keysExact(BuiltSampler* out) const;
    void unionCubic(BuiltSampler* out) const;
    // Where the axes keyed to the end (`going`) share their key times (one keyset's) after every
    // other axis has stopped: the first of them (the lead), whose key `firstKey` is their first
    // after that (the joint), from which the knots are their keys; null when there is no such
    // tail.
    const ChannelCurve* sharedTail(size_t* firstKey, bool going[3]) const;
    // Writes `count` knots at the `going` axes' own keys from key `from` on (times they share)
    // into `v`, knot by knot: for CUBICSPLINE (`cubic`) the three axes' in-tangents, values and
    // out-tangents side by side (the last knot leaving flat, as a cursor has it), else their
    // values; an axis not going holds `held[a]`.
    void writeOwnKeys(float* v, size_t from, size_t count, bool cubic, const bool going[3],
                      const double held[3]) const;
    // About how many frames and keys sampling would look at (kMaxSampledFrames at most).
    size_t sampledAtMost() const;
    // The union key times plus the whole frames inside every span that is not plain (see
    // plainSpans); false when that is more than kMaxSampledFrames.
    bool candidateTimes(std::vector<double>* times, double straightUpTo, std::string* why) const;
    // For each span between consecutive `keys` (the union key times), whether it needs no
    // samples inside: every axis holds still across it or runs in a straight line that changes
    // by less than `straightUpTo` (0 where the written pieces do not follow straight lines).
    std::vector<char> plainSpans(const std::vector<double>& keys, double straightUpTo) const;
    // The candidate times and each animated axis's value at each of them, and at each of them
    // rounded to a float as it is stored (an axis without a curve is left empty: it holds its
    // rest value). When float times can move a sample by at most a quarter of `tolerance` (the
    // axes' movements summed with `sumAxes`, else the largest), the samples keep the values at
    // their own times (`ownTimes`, `atStored` a copy of `axis`) and `drift` is that movement,
    // which the pieces must leave room for; otherwise `drift` is 0.
    bool sampleCandidates(std::vector<double>* times, std::vector<double> axis[3],
                          std::vector<double> atStored[3], double straightUpTo, double tolerance,
                          bool sumAxes, double* drift, bool* ownTimes, std::string* why) const;
    void evaluate(const std::vector<double>& times, std::vector<double> axis[3]) const;

    const ChannelCurve* curves_[3];
    const ChannelCurve* lead_ = nullptr;
    double rest_[3];
    int fps_;
};
