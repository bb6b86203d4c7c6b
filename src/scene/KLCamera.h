#pragma once

#include "scene/Mat4.h"

// The camera of a 3D view: it orbits a look-at point (`centre`) at `distance`, turned by `yaw`
// about the world's up axis (Y) and tilted by `pitch`, both in degrees. The camera moves
// at rates: each step of a drag moves it by an amount proportional to the pointer's offset
// from the drag's anchor, in pixels, so that a pointer held at the anchor moves nothing.
class KLCamera {
  public:
    // Degrees of turn, fraction of the distance panned, and zoom exponent per pixel of
    // offset and per step.
    static constexpr float kTumbleRate = 0.004f;
    static constexpr float kPanRate = 0.00003f;
    static constexpr float kZoomRate = 0.00004f;
    static constexpr float kMinDistance = 1e-4f;

    // Orbits the look-at point: dx turns about the up axis, dy tilts. With `constrained`,
    // only the larger of the two offsets acts.
    void Tumble(float dx, float dy, bool constrained);
    // Moves the look-at point in the view plane: dx to the right, dy down (screen y).
    void Move(float dx, float dy);
    // Dollies towards the look-at point (pointer right or up) or away from it.
    void Zoom(float dx, float dy);

    // Looks at the box's centre from the current direction, near enough that the box fills
    // a view of that aspect (width / height) with a small margin.
    void Frame(const Vec3& boxMin, const Vec3& boxMax, float aspect = 4.0f / 3.0f);
    // Looks from `eye` towards `target` (the direction of a scene camera).
    void Aim(const Vec3& eye, const Vec3& target);

    Vec3 Eye() const;
    Mat4 ViewMatrix() const;
    // Near and far planes that hold a sphere of `radius` around the look-at point.
    void ClipPlanes(float radius, float* zNear, float* zFar) const;

    Vec3 centre;
    float distance = 5.0f;
    float yaw = 0.0f;    // degrees about +Y; 0 looks down -Z from +Z
    float pitch = 0.0f;  // degrees, positive looks down on the subject; kept within +-89
    float fovY = 30.0f;  // degrees
};
