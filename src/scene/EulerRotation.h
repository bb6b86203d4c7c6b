#pragma once

#include <array>

// Conversions between unit quaternions (x, y, z, w as glTF stores them) and Euler angles in
// degrees applied X first, then Y, then Z (R = Rz * Ry * Rx), and the decomposition of a
// column-major 4x4 node matrix into translation, rotation and scale.
class EulerRotation {
  public:
    using Vec3 = std::array<double, 3>;
    using Quat = std::array<double, 4>;
    // A quaternion turns by half its angle: the half-angle in radians of one degree.
    static constexpr double kHalfRadiansPerDegree = 3.14159265358979323846 / 360;

    // Euler degrees of `q` (normalised first; a zero quaternion is the identity), each angle
    // in [-180, 180].
    static Vec3 ToEuler(const Quat& q);
    static Quat ToQuaternion(const Vec3& degrees);
    // `degrees` moved by whole turns per axis to lie as near as possible to `previous`.
    static Vec3 Unwrap(const Vec3& previous, const Vec3& degrees);
    // Translation, rotation (quaternion) and scale of a column-major matrix without shear.
    // The spherical linear interpolation from `a` to `b` at `u` (0..1), as a glTF player
    // interpolates LINEAR rotation samples; `a` and `b` are unit quaternions.
    static Quat Slerp(const Quat& a, const Quat& b, double u);
    // The angle in degrees of the rotation that takes `a` to `b` (unit quaternions).
    static double AngleBetween(const Quat& a, const Quat& b);
    static void Decompose(const double* matrix16, Vec3* translation, Quat* rotation, Vec3* scale);
};
