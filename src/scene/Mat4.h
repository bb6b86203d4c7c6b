#pragma once

#include <cmath>

// A 3-component vector of floats.
struct Vec3 {
    float x = 0, y = 0, z = 0;

    Vec3() = default;
    Vec3(float x_, float y_, float z_) : x(x_), y(y_), z(z_) {}
    Vec3 operator+(const Vec3& o) const { return {x + o.x, y + o.y, z + o.z}; }
    Vec3 operator-(const Vec3& o) const { return {x - o.x, y - o.y, z - o.z}; }
    Vec3 operator*(float s) const { return {x * s, y * s, z * s}; }
    float Dot(const Vec3& o) const { return x * o.x + y * o.y + z * o.z; }
    Vec3 Cross(const Vec3& o) const {
        return {y * o.z - z * o.y, z * o.x - x * o.z, x * o.y - y * o.x};
    }
    float Length() const { return std::sqrt(Dot(*this)); }
    // This vector scaled to length 1; (0, 0, 0) stays as it is.
    Vec3 Normalized() const;
};

// A 4 x 4 matrix of floats in column-major order (as OpenGL takes it): m[col * 4 + row].
struct Mat4 {
    float m[16];

    Mat4();  // identity
    static Mat4 Translation(const Vec3& t);
    static Mat4 Scaling(const Vec3& s);
    // Rotation by Euler angles in degrees, X first, then Y, then Z (R = Rz * Ry * Rx).
    static Mat4 EulerXYZ(const Vec3& degrees);
    // Rotation from a unit quaternion (x, y, z, w).
    static Mat4 Quaternion(float x, float y, float z, float w);
    // The local transform of a node from its nine channels TX TY TZ RX RY RZ SX SY SZ:
    // T * R * S.
    static Mat4 FromChannels(const double channels[9]);
    // Camera matrices (gluLookAt and gluPerspective).
    static Mat4 LookAt(const Vec3& eye, const Vec3& centre, const Vec3& up);
    static Mat4 Perspective(float fovYDegrees, float aspect, float zNear, float zFar);

    float& at(int row, int col) { return m[col * 4 + row]; }
    float at(int row, int col) const { return m[col * 4 + row]; }
    Mat4 operator*(const Mat4& o) const;
    Vec3 TransformPoint(const Vec3& p) const;
    Vec3 TransformDirection(const Vec3& d) const;
    // The inverse; the identity when the matrix is singular (*ok false).
    Mat4 Inverse(bool* ok = nullptr) const;
    // The upper 3 x 3 inverse transposed (for normals), as a 4 x 4 with no translation.
    Mat4 NormalMatrix() const;
};
