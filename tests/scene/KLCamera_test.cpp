#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>

#include "scene/KLCamera.h"

namespace {

bool Same(const KLCamera& a, const KLCamera& b) {
    return a.yaw == b.yaw && a.pitch == b.pitch && a.distance == b.distance &&
           a.centre.x == b.centre.x && a.centre.y == b.centre.y && a.centre.z == b.centre.z;
}

// A pointer held at the anchor moves nothing, however many steps. Away from it steps are
// rates: each turns by the offset times the rate; Shift keeps the larger axis.
TEST(KLCamera, TumbleStepsAndConstraint) {
    KLCamera camera;
    for (int i = 0; i < 100; ++i) {
        camera.Tumble(0, 0, false);
        camera.Move(0, 0);
        camera.Zoom(0, 0);
    }
    EXPECT_TRUE(Same(camera, KLCamera()));
    camera.Tumble(100, 0, false);
    camera.Tumble(100, 0, false);
    EXPECT_NEAR(camera.yaw, -2 * 100 * KLCamera::kTumbleRate, 1e-6);
    EXPECT_EQ(camera.pitch, 0);
    camera.Tumble(30, 100, true);
    EXPECT_NEAR(camera.yaw, -2 * 100 * KLCamera::kTumbleRate, 1e-6) << "x ignored";
    EXPECT_NEAR(camera.pitch, 100 * KLCamera::kTumbleRate, 1e-6);
    for (int i = 0; i < 10000; ++i)
        camera.Tumble(0, 1000, false);
    EXPECT_LE(camera.pitch, 89.0f) << "never over the top";
}

// Zoom: right or up comes closer; pan moves the look-at point across the view, not along it.
TEST(KLCamera, ZoomAndPan) {
    KLCamera camera;
    camera.Zoom(200, 0);
    EXPECT_LT(camera.distance, 5.0f);
    const float near = camera.distance;
    camera.Zoom(0, 200);
    EXPECT_GT(camera.distance, near) << "pointer below the anchor backs away";
    const Vec3 eye = camera.Eye();
    camera.Move(100, -50);
    EXPECT_LT(camera.centre.x, 0) << "the subject follows the pointer to the right";
    EXPECT_LT(camera.centre.y, 0) << "and up";
    EXPECT_NEAR(camera.centre.z, 0, 1e-6);
    EXPECT_NEAR((camera.Eye() - camera.centre).Length(), (eye - Vec3()).Length(), 1e-4);
}

// Framing puts the box's centre ahead and every corner inside the field of view of a view of
// that shape, the box filling most of it.
TEST(KLCamera, FrameShowsTheWholeBox) {
    KLCamera camera;
    camera.yaw = 40;
    camera.pitch = -20;
    const Vec3 lo(-1, 0, 2), hi(3, 1, 2.5f);
    const float aspect = 1.5f;
    camera.Frame(lo, hi, aspect);
    EXPECT_NEAR(camera.centre.x, 1, 1e-6);
    const Mat4 view = camera.ViewMatrix();
    const float t = std::tan(camera.fovY / 2 * float(M_PI) / 180);
    float widest = 0;
    for (int corner = 0; corner < 8; ++corner) {
        Vec3 p(corner & 1 ? hi.x : lo.x, corner & 2 ? hi.y : lo.y, corner & 4 ? hi.z : lo.z);
        Vec3 v = view.TransformPoint(p);
        ASSERT_LT(v.z, 0) << "in front of the camera";
        const float x = std::fabs(v.x) / -v.z / (t * aspect), y = std::fabs(v.y) / -v.z / t;
        EXPECT_LT(x, 1.0f) << "corner " << corner;
        EXPECT_LT(y, 1.0f) << "corner " << corner;
        widest = std::max({widest, x, y});
    }
    EXPECT_GT(widest, 0.8f) << "the box fills the view";
    camera.Frame(Vec3(), Vec3());  // a point: still a usable distance
    EXPECT_GT(camera.distance, 0);
}

}  // namespace
