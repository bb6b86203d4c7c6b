#include "scene/SamplerBuilder.h"

#include <algorithm>
#include <cmath>

#include "scene/ChannelCurve.h"
#include "scene/CurveCursor.h"
#include "scene/EulerRotation.h"
#include "scene/EulerSpline.h"
#include "scene/SampleReducer.h"
#include "scene/TurnSpline.h"

namespace {
// The share of a tolerance that the choice of samples may use; the rest is left for the
// rounding of what is stored as floats (a quaternion moves by about 1e-5 degrees, a value by
// one float step) and of the player's interpolation.
constexpr double kFitShare = 0.9;
// The largest share of the tolerance that float times may move a sample by before samples are
// valued at their stored times.
constexpr double kDriftShare = 0.25;
}  // namespace

SamplerBuilder::SamplerBuilder(const ChannelCurve* const curves[3], const double rest[3], int fps)
    : fps_(fps > 0 ? fps : 30) {
    bool anyMoving = false;
    for (int a = 0; a < 3; ++a) {
        curves_[a] = curves[a] && !curves[a]->empty() ? curves[a] : nullptr;
        rest_[a] = rest[a];
        anyMoving = anyMoving || (curves_[a] && !curves_[a]->Constant());
    }
    for (int a = 0; a < 3; ++a) {
        // An axis that holds one value throughout is written as that value: its key times
        // bring nothing the other axes need, so they neither widen the union nor make pieces.
        // (When no axis moves the curves are kept, so that the path stays animated.)
        if (anyMoving && curves_[a] && curves_[a]->Constant()) {
            rest_[a] = curves_[a]->keys().front().value;
            curves_[a] = nullptr;
        }
        lead_ = lead_ ? lead_ : curves_[a];
    }
}

bool SamplerBuilder::sharedTimes() const {
    // (the key counts first: axes keyed apart usually differ in them)
    for (const ChannelCurve* c : curves_) {
        if (c && c->keys().size() != lead_->keys().size()) {
            return false;
        }
    }
    for (const ChannelCurve* c : curves_) {
        if (!c || c == lead_) {
            continue;
        }
        for (size_t k = 0; k < c->keys().size(); ++k) {
            if (float(c->keys()[k].time) != float(lead_->keys()[k].time)) {
                return false;
            }
        }
    }
    for (size_t k = 1; k < lead_->keys().size(); ++k) {
        if (!(float(lead_->keys()[k].time) > float(lead_->keys()[k - 1].time))) {
            return false;  // two keys on one float time: not writable as they are
        }
    }
    return true;
}

bool SamplerBuilder::BuildVector(BuiltSampler* out, std::string* why) const {
    *out = BuiltSampler();
    out->width = 3;
    if (!lead_) {
        return true;
    }
    bool allLinear = true, allStep = true, anyStep = false;
    for (const ChannelCurve* c : curves_) {
        if (!c) {
            continue;
        }
        allLinear = allLinear && c->AllLinear();
        allStep = allStep && c->AllStep();
        anyStep = anyStep || std::any_of(c->keys().begin(), c->keys().end() - 1,
                                         [](const ChannelCurve::Key& k) {
                                             return k.out == ChannelCurve::kStep;
                                         });
    }
    bool shared = sharedTimes();
    if (shared && (allLinear || allStep || !anyStep)) {
        out->interpolation = allLinear ? "LINEAR" : (allStep ? "STEP" : "CUBICSPLINE");
        keysExact(out);
        return true;
    }
    if (!anyStep) {
        unionCubic(out);
        return true;
    }
    std::vector<double> times, axis[3], atStored[3];
    double drift = 0;
    bool ownTimes = false;
    if (!sampleCandidates(&times, axis, atStored, HUGE_VAL, kVectorTolerance, false, &drift,
                          &ownTimes, why)) {
        return false;
    }
    // An axis without a curve holds its rest value (its samples are not filled in).
    std::vector<const std::vector<double>*> moving, ends;
    for (int a = 0; a < 3; ++a) {
        if (!axis[a].empty()) {
            moving.push_back(&axis[a]);
            ends.push_back(&atStored[a]);
        }
    }
    std::vector<size_t> kept = SampleReducer(times, kVectorTolerance * kFitShare - drift)
                                   .Lines(moving, ends, true, HUGE_VAL);
    out->interpolation = "LINEAR";
    out->times.reserve(kept.size());
    float* v = out->SizeValues(kept.size() * 3);
    for (size_t k : kept) {
        out->times.push_back(BuiltSampler::Stored(times[k]));
        for (int a = 0; a < 3; ++a) {
            *v++ = BuiltSampler::Stored(axis[a].empty() ? rest_[a] : atStored[a][k]);
        }
    }
    return true;
}

bool SamplerBuilder::BuildRotation(BuiltSampler* out, std::string* why) const {
    *out = BuiltSampler();
    out->width = 4;
    if (!lead_) {
        return true;
    }
    int moving = -1, movingAxes = 0;
    for (int a = 0; a < 3; ++a) {
        if (curves_[a] && !curves_[a]->Constant()) {
            moving = a;
            ++movingAxes;
        }
    }
    if (movingAxes == 1 &&
        TurnSpline(*curves_[moving], moving, rest_)
            .Build(kRotationToleranceDegrees * kFitShare, kMaxSampledFrames, out)) {
        return true;  // cubic pieces at the turning axis's keys
    }
    if (movingAxes > 1 && EulerSpline(curves_, rest_)
                              .Build(kRotationToleranceDegrees * kFitShare, sampledAtMost(), out)) {
        return true;  // cubic pieces at the union of the axes' keys
    }
    // With one turning axis a straight span of it is followed exactly (see below), as long as
    // it turns by less than half a turn, which a piece would go the other way round.
    std::vector<double> times, axis[3], atStored[3];
    double drift = 0;
    bool ownTimes = false;
    if (!sampleCandidates(&times, axis, atStored, movingAxes <= 1 ? 90.0 : 0.0,
                          kRotationToleranceDegrees, true, &drift, &ownTimes, why)) {
        return false;
    }
    // An axis without a curve holds its rest value (its samples are not filled in).
    auto angle = [&](int a, size_t k) { return axis[a].empty() ? rest_[a] : axis[a][k]; };
    auto end = [&](int a, size_t k) { return axis[a].empty() ? rest_[a] : atStored[a][k]; };
    const SampleReducer reducer(times, kRotationToleranceDegrees * kFitShare - drift);
    const double halfRadians = EulerRotation::kHalfRadiansPerDegree;
    out->interpolation = "LINEAR";
    if (movingAxes <= 1) {
        // One axis turning between fixed ones: the rotation is a fixed one, a turn about that
        // axis, and another fixed one, and interpolation commutes with fixed rotations on either
        // side, so the angle by which a piece misses is the angle its straight line misses by.
        int a = moving < 0 ? 0 : moving;
        if (axis[a].empty()) {
            axis[a].assign(times.size(), rest_[a]);
            atStored[a] = axis[a];
        }
        std::vector<size_t> kept = reducer.Lines({&axis[a]}, {&atStored[a]}, false, 180);
        // The fixed axes' half-angle sines and cosines once; only the turning one per sample,
        // written straight out, each on the hemisphere of the one before (players take the
        // shortest way round).
        double c[3], sn[3];
        for (int b = 0; b < 3; ++b) {
            c[b] = std::cos(angle(b, 0) * halfRadians);
            sn[b] = std::sin(angle(b, 0) * halfRadians);
        }
        out->times.resize(kept.size());
        float* v = out->SizeValues(kept.size() * 4);
        double previous[4] = {0, 0, 0, 1};
        for (size_t n = 0; n < kept.size(); ++n, v += 4) {
            const size_t k = kept[n];
            c[a] = std::cos(atStored[a][k] * halfRadians);
            sn[a] = std::sin(atStored[a][k] * halfRadians);
            // qz * qy * qx, as EulerRotation::ToQuaternion
            double q[4] = {sn[0] * c[1] * c[2] - c[0] * sn[1] * sn[2],
                           c[0] * sn[1] * c[2] + sn[0] * c[1] * sn[2],
                           c[0] * c[1] * sn[2] - sn[0] * sn[1] * c[2],
                           c[0] * c[1] * c[2] + sn[0] * sn[1] * sn[2]};
            const double side = n > 0 && q[0] * previous[0] + q[1] * previous[1] +
                                                 q[2] * previous[2] + q[3] * previous[3] <
                                             0
                                    ? -1.0
                                    : 1.0;
            out->times[n] = BuiltSampler::Stored(times[k]);
            for (size_t i = 0; i < 4; ++i) {
                previous[i] = q[i] * side;
                v[i] = BuiltSampler::Stored(previous[i]);
            }
        }
        return true;
    }
    std::vector<EulerRotation::Quat> q(times.size()), ends(times.size());
    for (size_t k = 0; k < times.size(); ++k) {
        q[k] = EulerRotation::ToQuaternion({angle(0, k), angle(1, k), angle(2, k)});
        ends[k] = ownTimes ? q[k] : EulerRotation::ToQuaternion({end(0, k), end(1, k), end(2, k)});
    }
    std::vector<size_t> kept = reducer.Slerps(q, ends);
    out->times.resize(kept.size());
    float* v = out->SizeValues(kept.size() * 4);
    EulerRotation::Quat previous = {0, 0, 0, 1};
    for (size_t n = 0; n < kept.size(); ++n, v += 4) {
        // Each sample on the hemisphere of the one before: players take the shortest way round.
        EulerRotation::Quat r = ends[kept[n]];
        if (n > 0 &&
            r[0] * previous[0] + r[1] * previous[1] + r[2] * previous[2] + r[3] * previous[3] < 0) {
            for (double& x : r) {
                x = -x;
            }
        }
        out->times[n] = BuiltSampler::Stored(times[kept[n]]);
        for (size_t i = 0; i < 4; ++i) {
            v[i] = BuiltSampler::Stored(r[i]);
        }
        previous = r;
    }
    return true;
}

void SamplerBuilder::keysExact(BuiltSampler* out) const {
    const bool cubic = out->interpolation == "CUBICSPLINE";
    const auto& lead = lead_->keys();
    const size_t n = lead.size();
    out->times.resize(n);
    float* const values = out->SizeValues(n * (cubic ? 9 : 3));
    for (size_t k = 0; k < n; ++k) {
        out->times[k] = BuiltSampler::Stored(lead[k].time);
    }
    const bool going[3] = {curves_[0] != nullptr, curves_[1] != nullptr, curves_[2] != nullptr};
    writeOwnKeys(values, 0, n, cubic, going, rest_);
}

void SamplerBuilder::writeOwnKeys(float* v, size_t from, size_t count, bool cubic,
                                  const bool going[3], const double held[3]) const {
    std::vector<double> in[3], leave[3];
    const ChannelCurve::Key* key[3] = {nullptr, nullptr, nullptr};
    float still[3];
    for (int a = 0; a < 3; ++a) {
        still[a] = BuiltSampler::Stored(held[a]);
        if (going[a]) {
            key[a] = curves_[a]->keys().data() + from;
            if (cubic) {
                curves_[a]->Slopes(&in[a], &leave[a], from);
                leave[a].back() = 0;
            }
        }
    }
    const size_t value = cubic ? 3 : 0, stride = cubic ? 9 : 3;
    for (size_t k = 0; k < count; ++k, v += stride) {
        for (int a = 0; a < 3; ++a) {
            if (!key[a]) {
                v[value + a] = still[a];
                if (cubic) {
                    v[a] = v[6 + a] = 0.0f;
                }
            } else if (cubic) {
                v[a] = BuiltSampler::Stored(in[a][k]);
                v[3 + a] = BuiltSampler::Stored(key[a][k].value);
                v[6 + a] = BuiltSampler::Stored(leave[a][k]);
            } else {
                v[a] = BuiltSampler::Stored(key[a][k].value);
            }
        }
    }
}

void SamplerBuilder::unionCubic(BuiltSampler* out) const {
    // A piece of a cubic is a cubic: cutting every axis at the union of the key times keeps
    // each axis exact, with the slope on either side of every cut.
    out->interpolation = "CUBICSPLINE";
    // Up to the tail (see sharedTail), the union of the key times, read knot by knot through a
    // cursor on each axis, the axes side by side: in-tangents, values, out-tangents.
    size_t firstKey = 0;
    bool going[3] = {false, false, false};
    const ChannelCurve* lead = sharedTail(&firstKey, going);
    const double joint = lead ? lead->keys()[firstKey].time : HUGE_VAL;
    std::vector<double> times = ChannelCurve::UnionTimes(curves_, 3, joint);
    if (lead && !(!times.empty() && float(times.back()) == float(joint))) {
        lead = nullptr;
        times = ChannelCurve::UnionTimes(curves_, 3);
    }
    const size_t head = times.size(), count = lead ? lead->keys().size() - firstKey - 1 : 0;
    out->times.resize(head + count);
    float* const values = out->SizeValues((head + count) * 9);
    for (size_t k = 0; k < head; ++k) {
        out->times[k] = BuiltSampler::Stored(times[k]);
    }
    for (size_t k = 0; k < count; ++k) {
        out->times[head + k] = BuiltSampler::Stored(lead->keys()[firstKey + 1 + k].time);
    }
    const ChannelCurve none;
    CurveCursor cursor[3] = {CurveCursor(curves_[0] ? *curves_[0] : none),
                             CurveCursor(curves_[1] ? *curves_[1] : none),
                             CurveCursor(curves_[2] ? *curves_[2] : none)};
    float* v = values;
    for (size_t k = 0; k < head; ++k, v += 9) {
        for (int a = 0; a < 3; ++a) {
            if (!curves_[a]) {
                v[a] = v[6 + a] = 0.0f;
                v[3 + a] = BuiltSampler::Stored(rest_[a]);
                continue;
            }
            const CurveCursor::Point p = cursor[a].At(times[k]);
            v[a] = BuiltSampler::Stored(p.arriving);
            v[3 + a] = BuiltSampler::Stored(p.value);
            v[6 + a] = BuiltSampler::Stored(p.leaving);
        }
    }
    if (count == 0) {
        return;
    }
    // The tail: the going axes at their own keys after the joint, the others held.
    double held[3];
    for (int a = 0; a < 3; ++a) {
        held[a] = curves_[a] ? curves_[a]->keys().back().value : rest_[a];
    }
    writeOwnKeys(v, firstKey + 1, count, true, going, held);
}

const ChannelCurve* SamplerBuilder::sharedTail(size_t* firstKey, bool going[3]) const {
    // The axes keyed to the end, and the time at which the others stop (their last key).
    const double stop = ChannelCurve::OthersStop(curves_, 3, going);
    const ChannelCurve* lead = nullptr;
    for (int a = 2; a >= 0; --a) {
        lead = going[a] ? curves_[a] : lead;
    }
    if (!lead || stop == -HUGE_VAL) {
        return nullptr;
    }
    // The lead's first key on a float time after that (the joint), with keys after it that
    // every going axis shares (as many keys, on the same float times).
    const std::vector<ChannelCurve::Key>& keys = lead->keys();
    const size_t first = lead->FirstKeyAfter(stop);
    if (first + 2 > keys.size()) {
        return nullptr;
    }
    for (int a = 0; a < 3; ++a) {
        if (!going[a] || curves_[a] == lead) {
            continue;
        }
        const std::vector<ChannelCurve::Key>& other = curves_[a]->keys();
        if (other.size() != keys.size()) {
            return nullptr;
        }
        for (size_t k = first; k < keys.size(); ++k) {
            if (float(other[k].time) != float(keys[k].time)) {
                return nullptr;
            }
        }
    }
    *firstKey = first;
    return lead;
}

size_t SamplerBuilder::sampledAtMost() const {
    // The whole frames from the first key to the last, and the keys of the most keyed axis
    // (those of the others mostly share their times or sit on frames).
    double first = HUGE_VAL, last = -HUGE_VAL, keys = 0;
    for (const ChannelCurve* c : curves_) {
        if (c) {
            first = std::min(first, c->keys().front().time);
            last = std::max(last, c->keys().back().time);
            keys = std::max(keys, double(c->keys().size()));
        }
    }
    const double frames = std::floor(last * fps_) - std::ceil(first * fps_) + 1;
    return size_t(std::min(double(kMaxSampledFrames), std::max(0.0, frames) + keys));
}

std::vector<char> SamplerBuilder::plainSpans(const std::vector<double>& keys,
                                             double straightUpTo) const {
    std::vector<char> still(keys.empty() ? 0 : keys.size() - 1, 1);
    for (const ChannelCurve* c : curves_) {
        if (!c) {
            continue;
        }
        const auto& own = c->keys();
        size_t after = 0;  // the first of the curve's keys after the span's middle
        for (size_t k = 0; k < still.size(); ++k) {
            double mid = (keys[k] + keys[k + 1]) / 2;
            while (after < own.size() && own[after].time <= mid) {
                ++after;
            }
            if (after == 0 || after == own.size()) {
                continue;  // held before the first key or after the last
            }
            size_t i = after - 1;
            if (own[i].out == ChannelCurve::kLinear && own[i + 1].in == ChannelCurve::kLinear &&
                std::fabs(own[i + 1].value - own[i].value) < straightUpTo) {
                continue;  // a straight line, which the written pieces follow exactly
            }
            if (own[i].value != own[i + 1].value ||
                (own[i].out != ChannelCurve::kStep &&
                 (c->OutSlope(i) != 0 || c->InSlope(i + 1) != 0))) {
                still[k] = 0;
            }
        }
    }
    return still;
}

bool SamplerBuilder::candidateTimes(std::vector<double>* out, double straightUpTo,
                                    std::string* why) const {
    std::vector<double> keys = ChannelCurve::UnionTimes(curves_, 3);
    std::vector<char> still = plainSpans(keys, straightUpTo);
    // Count first, so that a curve that would need too many samples costs no memory.
    double count = double(keys.size());
    for (size_t k = 0; k + 1 < keys.size(); ++k) {
        if (!still[k]) {
            count += std::max(0.0, std::floor(keys[k + 1] * fps_) - std::ceil(keys[k] * fps_) + 1);
        }
    }
    if (count > double(kMaxSampledFrames)) {
        *why = "its keys span " + std::to_string(static_cast<long long>(count)) +
               " frames to sample, more than the " + std::to_string(kMaxSampledFrames) + " allowed";
        return false;
    }
    out->clear();
    out->reserve(size_t(count));
    for (size_t k = 0; k < keys.size(); ++k) {
        out->push_back(keys[k]);
        if (k + 1 == keys.size() || still[k]) {
            continue;
        }
        const float next = float(keys[k + 1]);
        for (double f = std::ceil(keys[k] * fps_), t = f / fps_; t < keys[k + 1]; t = ++f / fps_) {
            if (float(t) > float(out->back()) && float(t) < next) {
                out->push_back(t);
            }
        }
    }
    return true;
}

bool SamplerBuilder::sampleCandidates(std::vector<double>* times, std::vector<double> axis[3],
                                      std::vector<double> atStored[3], double straightUpTo,
                                      double tolerance, bool sumAxes, double* drift, bool* ownTimes,
                                      std::string* why) const {
    if (!candidateTimes(times, straightUpTo, why)) {
        return false;
    }
    evaluate(*times, axis);
    // A written sample sits at its time as a float, up to half a float step from its own: its
    // value is the curve's there. Where the curves cannot move by more than a small part of the
    // tolerance in that step, the samples keep the values at their own times and the pieces are
    // fitted within the tolerance less that part.
    *drift = 0;
    const double halfStep = (times->empty() ? 0.0 : std::fabs(times->back())) / (1 << 24);
    for (int a = 0; a < 3; ++a) {
        const double moved = axis[a].empty() ? 0.0 : curves_[a]->MaxSlope() * halfStep;
        *drift = sumAxes ? *drift + moved : std::max(*drift, moved);
    }
    *ownTimes = *drift <= tolerance * kDriftShare;
    if (*ownTimes) {
        for (int a = 0; a < 3; ++a) {
            atStored[a] = axis[a];
        }
        return true;
    }
    *drift = 0;
    std::vector<double> storedTimes(times->size());
    for (size_t k = 0; k < times->size(); ++k) {
        storedTimes[k] = double(float((*times)[k]));
    }
    evaluate(storedTimes, atStored);
    return true;
}

void SamplerBuilder::evaluate(const std::vector<double>& times, std::vector<double> axis[3]) const {
    for (int a = 0; a < 3; ++a) {
        if (curves_[a] && !curves_[a]->Constant()) {
            curves_[a]->EvaluateSorted(times, &axis[a]);
        } else if (curves_[a]) {
            axis[a].assign(times.size(), curves_[a]->keys().front().value);
        } else {
            axis[a].clear();  // holds rest_[a]
        }
    }
}
