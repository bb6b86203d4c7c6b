#include "scene/KLCamera.h"

#include <algorithm>
#include <cmath>

namespace {
constexpr float kDegrees = float(M_PI / 180.0);
constexpr float kMaxPitch = 89.0f;

// Unit vector from the look-at point towards the eye.
Vec3 back_of(float yaw, float pitch) {
    float cy = std::cos(yaw * kDegrees), sy = std::sin(yaw * kDegrees);
    float cp = std::cos(pitch * kDegrees), sp = std::sin(pitch * kDegrees);
    return {sy * cp, sp, cy * cp};
}
}  // namespace

void KLCamera::Tumble(float dx, float dy, bool constrained) {
    if (constrained) {
        if (std::fabs(dx) >= std::fabs(dy)) {
            dy = 0;
        } else {
            dx = 0;
        }
    }
    yaw = std::fmod(yaw - dx * kTumbleRate * 1.0f, 360.0f);
    pitch = std::clamp(pitch + dy * kTumbleRate, -kMaxPitch, kMaxPitch);
}

void KLCamera::Move(float dx, float dy) {
    Vec3 back = back_of(yaw, pitch);
    Vec3 right = Vec3(0, 1, 0).Cross(back).Normalized();
    Vec3 up = back.Cross(right);
    float step = distance * kPanRate;
    // The subject follows the pointer: the look-at point moves the other way.
    centre = centre - right * (dx * step) + up * (dy * step);
}

void KLCamera::Zoom(float dx, float dy) {
    distance = std::max(kMinDistance, distance * std::exp(-(dx - dy) * kZoomRate));
}

void KLCamera::Frame(const Vec3& boxMin, const Vec3& boxMax, float aspect) {
    centre = (boxMin + boxMax) * 0.5f;
    if (!std::isfinite(centre.x) || !std::isfinite(centre.y) || !std::isfinite(centre.z)) {
        centre = Vec3();
    }
    if (!(aspect > 0) || !std::isfinite(aspect)) {
        aspect = 1.0f;
    }
    // Each corner, in the camera's axes about the look-at point, needs the eye at least so
    // far back that it lies inside both half-angles of the view.
    const Vec3 back = back_of(yaw, pitch);
    const Vec3 right = Vec3(0, 1, 0).Cross(back).Normalized();
    const Vec3 up = back.Cross(right);
    const float t = std::tan(fovY * kDegrees / 2);
    float needed = 0;
    for (int corner = 0; corner < 8; ++corner) {
        const Vec3 p(corner & 1 ? boxMax.x : boxMin.x, corner & 2 ? boxMax.y : boxMin.y,
                     corner & 4 ? boxMax.z : boxMin.z);
        const Vec3 d = p - centre;
        const float z = d.Dot(back);
        needed = std::max(needed, z + std::fabs(d.Dot(up)) / t);
        needed = std::max(needed, z + std::fabs(d.Dot(right)) / (t * aspect));
    }
    if (!(needed > 0) || !std::isfinite(needed)) {
        needed = 1.0f;
    }
    distance = std::max(kMinDistance, needed * 1.1f);
}

void KLCamera::Aim(const Vec3& eye, const Vec3& target) {
    Vec3 back = eye - target;
    float len = back.Length();
    if (!(len > 0) || !std::isfinite(len)) {
        return;
    }
    back = back * (1.0f / len);
    centre = target;
    distance = len;
    pitch =
        std::clamp(std::asin(std::clamp(back.y, -1.0f, 1.0f)) / kDegrees, -kMaxPitch, kMaxPitch);
    yaw = std::atan2(back.x, back.z) / kDegrees;
}

Vec3 KLCamera::Eye() const {
    return centre + back_of(yaw, pitch) * distance;
}

Mat4 KLCamera::ViewMatrix() const {
    return Mat4::LookAt(Eye(), centre, Vec3(0, 1, 0));
}

void KLCamera::ClipPlanes(float radius, float* zNear, float* zFar) const {
    float r = std::isfinite(radius) && radius > 0 ? radius : 1.0f;
    *zFar = distance + r * 2.0f;
    *zNear = std::max(*zFar * 1e-4f, distance - r * 2.0f);
}
