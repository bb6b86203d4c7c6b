#include "scene/EulerRotation.h"

#include <algorithm>
#include <cmath>

namespace {
constexpr double kPi = 3.14159265358979323846;
constexpr double kDeg = 180.0 / kPi;

// Row-major rotation matrix of a unit quaternion.
void quat_matrix(const EulerRotation::Quat& q, double m[3][3]) {
    double x = q[0], y = q[1], z = q[2], w = q[3];
    m[0][0] = 1 - 2 * (y * y + z * z);
    m[0][1] = 2 * (x * y - z * w);
    m[0][2] = 2 * (x * z + y * w);
    m[1][0] = 2 * (x * y + z * w);
    m[1][1] = 1 - 2 * (x * x + z * z);
    m[1][2] = 2 * (y * z - x * w);
    m[2][0] = 2 * (x * z - y * w);
    m[2][1] = 2 * (y * z + x * w);
    m[2][2] = 1 - 2 * (x * x + y * y);
}

EulerRotation::Quat matrix_quat(const double m[3][3]) {
    EulerRotation::Quat q;
    double trace = m[0][0] + m[1][1] + m[2][2];
    if (trace > 0) {
        double s = 0.5 / std::sqrt(trace + 1.0);
        q = {(m[2][1] - m[1][2]) * s, (m[0][2] - m[2][0]) * s, (m[1][0] - m[0][1]) * s, 0.25 / s};
    } else if (m[0][0] > m[1][1] && m[0][0] > m[2][2]) {
        double s = 2.0 * std::sqrt(1.0 + m[0][0] - m[1][1] - m[2][2]);
        q = {0.25 * s, (m[0][1] + m[1][0]) / s, (m[0][2] + m[2][0]) / s, (m[2][1] - m[1][2]) / s};
    } else if (m[1][1] > m[2][2]) {
        double s = 2.0 * std::sqrt(1.0 + m[1][1] - m[0][0] - m[2][2]);
        q = {(m[0][1] + m[1][0]) / s, 0.25 * s, (m[1][2] + m[2][1]) / s, (m[0][2] - m[2][0]) / s};
    } else {
        double s = 2.0 * std::sqrt(1.0 + m[2][2] - m[0][0] - m[1][1]);
        q = {(m[0][2] + m[2][0]) / s, (m[1][2] + m[2][1]) / s, 0.25 * s, (m[1][0] - m[0][1]) / s};
    }
    double n = std::sqrt(q[0] * q[0] + q[1] * q[1] + q[2] * q[2] + q[3] * q[3]);
    if (!(n > 0) || !std::isfinite(n)) {
        return {0, 0, 0, 1};
    }
    return {q[0] / n, q[1] / n, q[2] / n, q[3] / n};
}
}  // namespace

EulerRotation::Vec3 EulerRotation::ToEuler(const Quat& in) {
    double n = std::sqrt(in[0] * in[0] + in[1] * in[1] + in[2] * in[2] + in[3] * in[3]);
    Quat q = {0, 0, 0, 1};
    if (n > 0 && std::isfinite(n)) {
        q = {in[0] / n, in[1] / n, in[2] / n, in[3] / n};
    }
    double m[3][3];
    quat_matrix(q, m);
    // R = Rz*Ry*Rx: m[2][0] = -sin y, m[2][1] = cos y sin x, m[2][2] = cos y cos x,
    // m[1][0] = cos y sin z, m[0][0] = cos y cos z.
    double sy = -m[2][0];
    sy = sy > 1 ? 1 : (sy < -1 ? -1 : sy);
    double x, y = std::asin(sy), z;
    if (std::fabs(sy) < 0.9999999) {
        x = std::atan2(m[2][1], m[2][2]);
        z = std::atan2(m[1][0], m[0][0]);
    } else {  // gimbal lock: put the whole turn about X
        x = std::atan2(-m[1][2], m[1][1]);
        z = 0;
    }
    return {x * kDeg, y * kDeg, z * kDeg};
}

EulerRotation::Quat EulerRotation::ToQuaternion(const Vec3& d) {
    double hx = d[0] / kDeg / 2, hy = d[1] / kDeg / 2, hz = d[2] / kDeg / 2;
    double cx = std::cos(hx), sx = std::sin(hx);
    double cy = std::cos(hy), sy = std::sin(hy);
    double cz = std::cos(hz), sz = std::sin(hz);
    // qz * qy * qx
    return {sx * cy * cz - cx * sy * sz, cx * sy * cz + sx * cy * sz, cx * cy * sz - sx * sy * cz,
            cx * cy * cz + sx * sy * sz};
}

EulerRotation::Vec3 EulerRotation::Unwrap(const Vec3& previous, const Vec3& degrees) {
    Vec3 out = degrees;
    for (int a = 0; a < 3; ++a) {
        double turns = std::round((previous[a] - out[a]) / 360.0);
        if (std::isfinite(turns)) {
            out[a] += turns * 360.0;
        }
    }
    return out;
}

void EulerRotation::Decompose(const double* mat, Vec3* t, Quat* r, Vec3* s) {
    *t = {mat[12], mat[13], mat[14]};
    double cols[3][3];
    for (int c = 0; c < 3; ++c) {
        double len = std::sqrt(mat[c * 4] * mat[c * 4] + mat[c * 4 + 1] * mat[c * 4 + 1] +
                               mat[c * 4 + 2] * mat[c * 4 + 2]);
        (*s)[c] = len;
        for (int k = 0; k < 3; ++k) {
            cols[c][k] = len > 0 ? mat[c * 4 + k] / len : (c == k ? 1.0 : 0.0);
        }
    }
    // A mirroring matrix keeps a proper rotation by negating one scale.
    double det = cols[0][0] * (cols[1][1] * cols[2][2] - cols[2][1] * cols[1][2]) -
                 cols[1][0] * (cols[0][1] * cols[2][2] - cols[2][1] * cols[0][2]) +
                 cols[2][0] * (cols[0][1] * cols[1][2] - cols[1][1] * cols[0][2]);
    if (det < 0) {
        (*s)[0] = -(*s)[0];
        for (int k = 0; k < 3; ++k) {
            cols[0][k] = -cols[0][k];
        }
    }
    double m[3][3];
    for (int row = 0; row < 3; ++row) {
        for (int c = 0; c < 3; ++c) {
            m[row][c] = cols[c][row];
        }
    }
    *r = matrix_quat(m);
}

EulerRotation::Quat EulerRotation::Slerp(const Quat& a, const Quat& b, double u) {
    double dot = a[0] * b[0] + a[1] * b[1] + a[2] * b[2] + a[3] * b[3];
    double sign = dot < 0 ? -1.0 : 1.0;
    dot *= sign;
    double wa = 1 - u, wb = u;
    if (dot < 0.9999999) {
        double angle = std::acos(dot), s = std::sin(angle);
        wa = std::sin((1 - u) * angle) / s;
        wb = std::sin(u * angle) / s;
    }
    Quat q;
    for (size_t i = 0; i < 4; ++i) {
        q[i] = wa * a[i] + wb * sign * b[i];
    }
    double n = std::sqrt(q[0] * q[0] + q[1] * q[1] + q[2] * q[2] + q[3] * q[3]);
    for (double& v : q) {
        v /= n;
    }
    return q;
}

double EulerRotation::AngleBetween(const Quat& a, const Quat& b) {
    // The chord between the nearer of b and -b and a is 2 sin(angle / 4): accurate for the
    // tiny angles that tolerances are about, where acos of the dot product is not.
    double same = 0, opposite = 0;
    for (size_t i = 0; i < 4; ++i) {
        same += (a[i] - b[i]) * (a[i] - b[i]);
        opposite += (a[i] + b[i]) * (a[i] + b[i]);
    }
    double chord = std::sqrt(std::min(same, opposite));
    return 4 * std::asin(std::min(1.0, chord / 2)) * kDeg;
}
