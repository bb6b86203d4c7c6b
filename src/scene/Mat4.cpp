#include "scene/Mat4.h"

#include <cstring>

namespace {
constexpr float kDegrees = float(M_PI / 180.0);
}

Vec3 Vec3::Normalized() const {
    float len = Length();
    return len > 0 ? *this * (1.0f / len) : *this;
}

Mat4::Mat4() {
    std::memset(m, 0, sizeof m);
    m[0] = m[5] = m[10] = m[15] = 1.0f;
}

Mat4 Mat4::Translation(const Vec3& t) {
    Mat4 r;
    r.m[12] = t.x, r.m[13] = t.y, r.m[14] = t.z;
    return r;
}

Mat4 Mat4::Scaling(const Vec3& s) {
    Mat4 r;
    r.m[0] = s.x, r.m[5] = s.y, r.m[10] = s.z;
    return r;
}

Mat4 Mat4::EulerXYZ(const Vec3& degrees) {
    Mat4 rx, ry, rz;
    float cx = std::cos(degrees.x * kDegrees), sx = std::sin(degrees.x * kDegrees);
    float cy = std::cos(degrees.y * kDegrees), sy = std::sin(degrees.y * kDegrees);
    float cz = std::cos(degrees.z * kDegrees), sz = std::sin(degrees.z * kDegrees);
    rx.at(1, 1) = cx, rx.at(1, 2) = -sx, rx.at(2, 1) = sx, rx.at(2, 2) = cx;
    ry.at(0, 0) = cy, ry.at(0, 2) = sy, ry.at(2, 0) = -sy, ry.at(2, 2) = cy;
    rz.at(0, 0) = cz, rz.at(0, 1) = -sz, rz.at(1, 0) = sz, rz.at(1, 1) = cz;
    return rz * ry * rx;
}

Mat4 Mat4::Quaternion(float x, float y, float z, float w) {
    Mat4 r;
    r.at(0, 0) = 1 - 2 * (y * y + z * z);
    r.at(0, 1) = 2 * (x * y - z * w);
    r.at(0, 2) = 2 * (x * z + y * w);
    r.at(1, 0) = 2 * (x * y + z * w);
    r.at(1, 1) = 1 - 2 * (x * x + z * z);
    r.at(1, 2) = 2 * (y * z - x * w);
    r.at(2, 0) = 2 * (x * z - y * w);
    r.at(2, 1) = 2 * (y * z + x * w);
    r.at(2, 2) = 1 - 2 * (x * x + y * y);
    return r;
}

Mat4 Mat4::FromChannels(const double c[9]) {
    return Translation(Vec3(float(c[0]), float(c[1]), float(c[2]))) *
           EulerXYZ(Vec3(float(c[3]), float(c[4]), float(c[5]))) *
           Scaling(Vec3(float(c[6]), float(c[7]), float(c[8])));
}

Mat4 Mat4::LookAt(const Vec3& eye, const Vec3& centre, const Vec3& up) {
    Vec3 f = (centre - eye).Normalized();
    Vec3 s = f.Cross(up).Normalized();
    Vec3 u = s.Cross(f);
    Mat4 r;
    r.at(0, 0) = s.x, r.at(0, 1) = s.y, r.at(0, 2) = s.z;
    r.at(1, 0) = u.x, r.at(1, 1) = u.y, r.at(1, 2) = u.z;
    r.at(2, 0) = -f.x, r.at(2, 1) = -f.y, r.at(2, 2) = -f.z;
    r.at(0, 3) = -s.Dot(eye), r.at(1, 3) = -u.Dot(eye), r.at(2, 3) = f.Dot(eye);
    return r;
}

Mat4 Mat4::Perspective(float fovY, float aspect, float zNear, float zFar) {
    Mat4 r;
    float f = 1.0f / std::tan(fovY * kDegrees / 2);
    r.at(0, 0) = f / aspect;
    r.at(1, 1) = f;
    r.at(2, 2) = (zFar + zNear) / (zNear - zFar);
    r.at(2, 3) = 2 * zFar * zNear / (zNear - zFar);
    r.at(3, 2) = -1;
    r.at(3, 3) = 0;
    return r;
}

Mat4 Mat4::operator*(const Mat4& o) const {
    Mat4 r;
    for (int c = 0; c < 4; ++c) {
        for (int row = 0; row < 4; ++row) {
            float s = 0;
            for (int k = 0; k < 4; ++k) {
                s += at(row, k) * o.at(k, c);
            }
            r.at(row, c) = s;
        }
    }
    return r;
}

Vec3 Mat4::TransformPoint(const Vec3& p) const {
    return {m[0] * p.x + m[4] * p.y + m[8] * p.z + m[12],
            m[1] * p.x + m[5] * p.y + m[9] * p.z + m[13],
            m[2] * p.x + m[6] * p.y + m[10] * p.z + m[14]};
}

Vec3 Mat4::TransformDirection(const Vec3& d) const {
    return {m[0] * d.x + m[4] * d.y + m[8] * d.z, m[1] * d.x + m[5] * d.y + m[9] * d.z,
            m[2] * d.x + m[6] * d.y + m[10] * d.z};
}

Mat4 Mat4::Inverse(bool* ok) const {
    // Gauss-Jordan elimination with partial pivoting on [A | I].
    double a[4][8];
    for (int r = 0; r < 4; ++r) {
        for (int c = 0; c < 4; ++c) {
            a[r][c] = at(r, c);
            a[r][c + 4] = r == c ? 1.0 : 0.0;
        }
    }
    for (int c = 0; c < 4; ++c) {
        int pivot = c;
        for (int r = c + 1; r < 4; ++r) {
            if (std::fabs(a[r][c]) > std::fabs(a[pivot][c])) {
                pivot = r;
            }
        }
        if (!(std::fabs(a[pivot][c]) > 1e-20)) {
            if (ok) {
                *ok = false;
            }
            return Mat4();
        }
        if (pivot != c) {
            for (int k = 0; k < 8; ++k) {
                std::swap(a[c][k], a[pivot][k]);
            }
        }
        double inv = 1.0 / a[c][c];
        for (int k = 0; k < 8; ++k) {
            a[c][k] *= inv;
        }
        for (int r = 0; r < 4; ++r) {
            if (r != c && a[r][c] != 0.0) {
                double f = a[r][c];
                for (int k = 0; k < 8; ++k) {
                    a[r][k] -= f * a[c][k];
                }
            }
        }
    }
    Mat4 out;
    for (int r = 0; r < 4; ++r) {
        for (int c = 0; c < 4; ++c) {
            out.at(r, c) = float(a[r][c + 4]);
        }
    }
    if (ok) {
        *ok = true;
    }
    return out;
}

Mat4 Mat4::NormalMatrix() const {
    Mat4 upper = *this;
    upper.m[12] = upper.m[13] = upper.m[14] = 0;
    upper.m[3] = upper.m[7] = upper.m[11] = 0;
    upper.m[15] = 1;
    Mat4 inv = upper.Inverse();
    Mat4 t;
    for (int r = 0; r < 3; ++r) {
        for (int c = 0; c < 3; ++c) {
            t.at(r, c) = inv.at(c, r);
        }
    }
    return t;
}
