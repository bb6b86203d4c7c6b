#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>

#include "scene/KLCamera.h"

namespace {

// A pointer held at the anchor moves nothing, however many steps. Away from it steps are
// rates: each turns by the offset times the rate; Shift keeps the larger axis.
TEST(KLCamera, TumbleStepsAndConstraint) {
    KLCamera camera;
    for (int i = 0; i < 100; ++i) {
        camera.Tumble(0, 0, false);
        camera.Move(0, 0);
        camera.Zoom(0, 0);
    }
    const KLCamera rest;
    EXPECT_TRUE(camera.yaw == rest.yaw && camera.pitch == rest.pitch &&
                camera.distance == rest.distance && camera.centre.x == rest.centre.x &&
                camera.centre.y == rest.centre.y && camera.centre.z == rest.centre.z);
    camera.Tumble(100, 0, false);
    camera.Tumble(30, 100, true);
    EXPECT_NEAR(camera.yaw, -100 * KLCamera::kTumbleRate, 1e-6) << "x ignored with Shift";
    EXPECT_NEAR(camera.pitch, 100 * KLCamera::kTumbleRate, 1e-6);
    for (int i = 0; i < 10000; ++i)
        camera.Tumble(0, 1000, false);
    EXPECT_LE(camera.pitch, 89.0f) << "never over the top";
}

// Framing puts the box's centre ahead and every corner inside the field of view of a view of
// that shape, the box filling most of it.
TEST(KLCamera, FrameShowsTheWholeBox) {
    KLCamera camera;
    camera.yaw = 40;
    camera.pitch = -20;
    const Vec3 lo(-1, 0, 2), hi(3, 1, 2.5f);
    const float aspect = 1.5f, t = std::tan(camera.fovY / 2 * float(M_PI) / 180);
    camera.Frame(lo, hi, aspect);
    EXPECT_NEAR(camera.centre.x, 1, 1e-6);
    float widest = 0;
    for (int corner = 0; corner < 8; ++corner) {
        Vec3 v = camera.ViewMatrix().TransformPoint(
            Vec3(corner & 1 ? hi.x : lo.x, corner & 2 ? hi.y : lo.y, corner & 4 ? hi.z : lo.z));
        ASSERT_LT(v.z, 0) << "in front of the camera";
        const float x = std::fabs(v.x) / -v.z / (t * aspect), y = std::fabs(v.y) / -v.z / t;
        EXPECT_TRUE(x < 1 && y < 1) << "corner " << corner;
        widest = std::max({widest, x, y});
    }
    EXPECT_GT(widest, 0.8f) << "the box fills the view";
    camera.Frame(Vec3(), Vec3());  // a point: still a usable distance
    EXPECT_GT(camera.distance, 0);
}

}  // namespace
