#define GL_GLEXT_PROTOTYPES 1
#include "scene/gl/SceneRenderer.h"

#include <algorithm>
#include <cmath>
#include <cstring>

#include <GL/gl.h>
#include <GL/glext.h>

#include "scene/KLCamera.h"
#include "scene/KLScene.h"
#include "toolkit/KLImageSGI.h"

const float SceneRenderer::kBackground[3] = {0.20f, 0.22f, 0.26f};

namespace {
// The most lights drawn (fixed-function GL offers at least eight).
constexpr int kMaxLights = 8;

GLenum gl_mode(int mode) {
    switch (mode) {
        case ScenePrimitive::kPoints:
            return GL_POINTS;
        case ScenePrimitive::kLines:
            return GL_LINES;
        default:
            return GL_TRIANGLES;
    }
}
}  // namespace

SceneRenderer::SceneRenderer() = default;
SceneRenderer::~SceneRenderer() = default;

void SceneRenderer::Release() {
    if (!textures_.empty()) {
        glDeleteTextures(GLsizei(textures_.size()), textures_.data());
    }
    textures_.clear();
    textureScene_ = nullptr;
    textureGeneration_ = -1;
}

void SceneRenderer::upload_textures(const KLScene& scene) {
    if (textureScene_ == &scene && textureGeneration_ == scene.Generation()) {
        return;
    }
    Release();
    textureScene_ = &scene;
    textureGeneration_ = scene.Generation();
    const std::vector<SceneTexture>& in = scene.Geometry().textures;
    textures_.assign(in.size(), 0);
    for (size_t t = 0; t < in.size(); ++t) {
        if (!in[t].Usable()) {
            continue;
        }
        glGenTextures(1, &textures_[t]);
        glBindTexture(GL_TEXTURE_2D, textures_[t]);
        glPixelStorei(GL_UNPACK_ALIGNMENT, 1);
        glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_MIN_FILTER, GL_LINEAR);
        glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_MAG_FILTER, GL_LINEAR);
        glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_WRAP_S, GL_REPEAT);
        glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_WRAP_T, GL_REPEAT);
        glTexImage2D(GL_TEXTURE_2D, 0, GL_RGBA, in[t].width, in[t].height, 0, GL_RGBA,
                     GL_UNSIGNED_BYTE, in[t].rgba.data());
    }
    glBindTexture(GL_TEXTURE_2D, 0);
}

void SceneRenderer::set_lights(const KLScene& scene, const float* view) {
    const float ambient[4] = {0.25f, 0.25f, 0.25f, 1.0f};
    glLightModelfv(GL_LIGHT_MODEL_AMBIENT, ambient);
    for (int i = 0; i < kMaxLights; ++i) {
        glDisable(GLenum(GL_LIGHT0 + i));
    }
    const std::vector<SceneLight>& lights = scene.Geometry().lights;
    if (lights.empty()) {
        // A head light: from the eye, along the view direction.
        glLoadIdentity();
        const float position[4] = {0, 0, 1, 0};
        const float white[4] = {0.85f, 0.85f, 0.85f, 1};
        glLightfv(GL_LIGHT0, GL_POSITION, position);
        glLightfv(GL_LIGHT0, GL_DIFFUSE, white);
        glEnable(GL_LIGHT0);
        glLoadMatrixf(view);
        return;
    }
    glLoadMatrixf(view);
    int used = 0;
    for (const SceneLight& light : lights) {
        if (used == kMaxLights || light.node < 0 || light.node >= scene.NodeCount()) {
            continue;
        }
        const Mat4& m = scene.WorldMatrix(light.node);
        // Photometric intensities differ by orders of magnitude between light kinds and
        // files; the views show each light's colour at full strength, dimmed only below 1.
        const float strength = std::clamp(light.intensity, 0.0f, 1.0f);
        const float colour[4] = {light.colour[0] * strength, light.colour[1] * strength,
                                 light.colour[2] * strength, 1};
        GLenum id = GLenum(GL_LIGHT0 + used);
        if (light.type == SceneLight::kDirectional) {
            Vec3 dir = m.TransformDirection(Vec3(0, 0, -1)).Normalized();
            const float position[4] = {-dir.x, -dir.y, -dir.z, 0};
            glLightfv(id, GL_POSITION, position);
        } else {
            Vec3 at = m.TransformPoint(Vec3(0, 0, 0));
            const float position[4] = {at.x, at.y, at.z, 1};
            glLightfv(id, GL_POSITION, position);
        }
        glLightfv(id, GL_DIFFUSE, colour);
        glEnable(id);
        ++used;
    }
}

void SceneRenderer::Draw(const KLScene* scene, const KLCamera& camera, int width, int height,
                         const Options& options) {
    glViewport(0, 0, std::max(width, 1), std::max(height, 1));
    glClearColor(kBackground[0], kBackground[1], kBackground[2], 1.0f);
    glClear(GL_COLOR_BUFFER_BIT | GL_DEPTH_BUFFER_BIT);
    if (!scene || scene->DrawItems().empty()) {
        return;
    }
    Vec3 lo, hi;
    float radius = 1.0f;
    if (scene->Bounds(&lo, &hi)) {
        radius = std::max((hi - lo).Length() * 0.5f + (camera.centre - (lo + hi) * 0.5f).Length(),
                          1e-4f);
    }
    float zNear, zFar;
    camera.ClipPlanes(radius, &zNear, &zFar);
    const float aspect = float(std::max(width, 1)) / float(std::max(height, 1));
    const Mat4 projection = Mat4::Perspective(camera.fovY, aspect, zNear, zFar);
    const Mat4 view = camera.ViewMatrix();
    glMatrixMode(GL_PROJECTION);
    glLoadMatrixf(projection.m);
    glMatrixMode(GL_MODELVIEW);

    glEnable(GL_DEPTH_TEST);
    glEnable(GL_NORMALIZE);
    glEnable(GL_LIGHTING);
    glEnable(GL_COLOR_MATERIAL);
    glColorMaterial(GL_FRONT_AND_BACK, GL_AMBIENT_AND_DIFFUSE);
    glShadeModel(GL_SMOOTH);
    set_lights(*scene, view.m);

    const int feedback = scene->Feedback();
    glPolygonMode(GL_FRONT_AND_BACK, feedback == 0 ? GL_POINT : feedback == 1 ? GL_LINE : GL_FILL);
    glPointSize(2.0f);
    glLightModeli(GL_LIGHT_MODEL_TWO_SIDE, feedback == 3 ? GL_TRUE : GL_FALSE);
    const bool textures = options.textures && !options.fast && feedback >= 2;
    if (textures) {
        upload_textures(*scene);
    }

    glEnableClientState(GL_VERTEX_ARRAY);
    glEnableClientState(GL_NORMAL_ARRAY);
    for (const SceneDrawItem& item : scene->DrawItems()) {
        const ScenePrimitive& prim = *item.primitive;
        const SceneMaterial& mat = *item.material;
        if (feedback == 2 && !mat.doubleSided) {
            glEnable(GL_CULL_FACE);
            glCullFace(GL_BACK);
        } else {
            glDisable(GL_CULL_FACE);
        }
        const GLuint texture =
            textures && mat.texture >= 0 && size_t(mat.texture) < textures_.size()
                ? textures_[size_t(mat.texture)]
                : 0;
        if (texture && !prim.texcoords.empty()) {
            glEnable(GL_TEXTURE_2D);
            glBindTexture(GL_TEXTURE_2D, texture);
            glTexEnvi(GL_TEXTURE_ENV, GL_TEXTURE_ENV_MODE, GL_MODULATE);
            glEnableClientState(GL_TEXTURE_COORD_ARRAY);
            glTexCoordPointer(2, GL_FLOAT, 0, prim.texcoords.data());
        } else {
            glDisable(GL_TEXTURE_2D);
            glDisableClientState(GL_TEXTURE_COORD_ARRAY);
        }
        glColor4fv(mat.baseColour);
        glPushMatrix();
        glMultMatrixf(item.world.m);
        glVertexPointer(3, GL_FLOAT, 0, item.positions);
        glNormalPointer(GL_FLOAT, 0, item.normals);
        // The vertex range spares the driver a scan of the indices for their bounds.
        glDrawRangeElements(gl_mode(prim.mode), 0, GLuint(prim.VertexCount() - 1),
                            GLsizei(prim.indices.size()), GL_UNSIGNED_INT, prim.indices.data());
        glPopMatrix();
    }
    glDisableClientState(GL_TEXTURE_COORD_ARRAY);
    glDisableClientState(GL_NORMAL_ARRAY);
    glDisableClientState(GL_VERTEX_ARRAY);
    glDisable(GL_TEXTURE_2D);
    glDisable(GL_CULL_FACE);
    glPolygonMode(GL_FRONT_AND_BACK, GL_FILL);
}

std::unique_ptr<KLImageSGI> SceneRenderer::DrawOffscreen(
    int width, int height, const std::function<void(int, int)>& draw) {
    GLuint fbo = 0, colour = 0, depth = 0;
    glGenFramebuffers(1, &fbo);
    glBindFramebuffer(GL_FRAMEBUFFER, fbo);
    glGenRenderbuffers(1, &colour);
    glBindRenderbuffer(GL_RENDERBUFFER, colour);
    glRenderbufferStorage(GL_RENDERBUFFER, GL_RGBA8, width, height);
    glFramebufferRenderbuffer(GL_FRAMEBUFFER, GL_COLOR_ATTACHMENT0, GL_RENDERBUFFER, colour);
    glGenRenderbuffers(1, &depth);
    glBindRenderbuffer(GL_RENDERBUFFER, depth);
    glRenderbufferStorage(GL_RENDERBUFFER, GL_DEPTH_COMPONENT24, width, height);
    glFramebufferRenderbuffer(GL_FRAMEBUFFER, GL_DEPTH_ATTACHMENT, GL_RENDERBUFFER, depth);
    std::unique_ptr<KLImageSGI> image;
    if (glCheckFramebufferStatus(GL_FRAMEBUFFER) == GL_FRAMEBUFFER_COMPLETE) {
        draw(width, height);
        glFinish();
        image = std::make_unique<KLImageSGI>(width, height);
        std::vector<uint8_t> rows(size_t(width) * size_t(height) * 4);
        glPixelStorei(GL_PACK_ALIGNMENT, 1);
        glReadPixels(0, 0, width, height, GL_RGBA, GL_UNSIGNED_BYTE, rows.data());
        // GL gives the bottom row first.
        const size_t stride = size_t(width) * 4;
        for (int y = 0; y < height; ++y) {
            std::memcpy(image->Pixels() + size_t(y) * stride,
                        rows.data() + size_t(height - 1 - y) * stride, stride);
        }
    }
    glBindFramebuffer(GL_FRAMEBUFFER, 0);
    glDeleteRenderbuffers(1, &depth);
    glDeleteRenderbuffers(1, &colour);
    glDeleteFramebuffers(1, &fbo);
    return image;
}
