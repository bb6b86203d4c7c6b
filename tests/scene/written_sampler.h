#pragma once

#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

#include "scene/EulerRotation.h"
#include "scene/SceneChecker.h"

// The sampler written for `node`'s `path`, read back raw from the file's model.
struct Written {
    int clip = -1;
    int channels = 0;  // channels on that node path, over every clip
    std::string interpolation;
    std::vector<float> times, values;
};
inline Written WrittenSampler(const tinygltf::Model& m, int node, const std::string& path) {
    Written w;
    std::string why;
    for (size_t a = 0; a < m.animations.size(); ++a) {
        for (const tinygltf::AnimationChannel& c : m.animations[a].channels) {
            if (c.target_node == node && c.target_path == path) {
                const tinygltf::AnimationSampler& s = m.animations[a].samplers[size_t(c.sampler)];
                ++w.channels, w.clip = int(a), w.interpolation = s.interpolation;
                EXPECT_TRUE(SceneChecker::ReadFloats(m, s.input, 1, &w.times, &why) &&
                            SceneChecker::ReadFloats(m, s.output, path == "rotation" ? 4 : 3,
                                                     &w.values, &why))
                    << why;
            }
        }
    }
    return w;
}

// A sampler's value at `t` as players read it: lerp, slerp for LINEAR quaternions, the cubic
// Hermite of each component for CUBICSPLINE (normalised for quaternions).
inline std::vector<double> SampleAt(const Written& w, double t, int width) {
    size_t n = w.times.size(), i = 0;
    while (i + 1 < n && w.times[i + 1] <= t) {
        ++i;
    }
    const bool cubic = w.interpolation == "CUBICSPLINE";
    // Knot k's in-tangent (part 0), value (1) or out-tangent (2).
    auto at = [&](size_t k, int part = 1) {
        const long first = (cubic ? long(k) * 3 + part : long(k)) * width;
        return std::vector<double>(w.values.begin() + first, w.values.begin() + first + width);
    };
    if (t <= w.times[0] || i + 1 >= n) {
        return at(t <= w.times[0] ? 0 : n - 1);
    }
    const double dt = double(w.times[i + 1]) - w.times[i], u = (t - w.times[i]) / dt;
    std::vector<double> a = at(i), b = at(i + 1);
    if (cubic) {
        std::vector<double> leave = at(i, 2), arrive = at(i + 1, 0);
        const double u2 = u * u, u3 = u2 * u;
        double norm = 0;
        for (size_t k = 0; k < size_t(width); ++k) {
            a[k] = (2 * u3 - 3 * u2 + 1) * a[k] + (u3 - 2 * u2 + u) * dt * leave[k] +
                   (-2 * u3 + 3 * u2) * b[k] + (u3 - u2) * dt * arrive[k];
            norm += a[k] * a[k];
        }
        for (size_t k = 0; width == 4 && k < 4; ++k) {
            a[k] /= std::sqrt(norm);
        }
        return a;
    }
    if (width == 4) {
        EulerRotation::Quat q =
            EulerRotation::Slerp({a[0], a[1], a[2], a[3]}, {b[0], b[1], b[2], b[3]}, u);
        return {q[0], q[1], q[2], q[3]};
    }
    for (int k = 0; k < width; ++k) {
        a[size_t(k)] += (b[size_t(k)] - a[size_t(k)]) * u;
    }
    return a;
}
