#pragma once

#include <functional>
#include <memory>
#include <vector>

class KLCamera;
class KLImageSGI;
class KLScene;

// Draws the evaluated state of a KLScene with OpenGL 2.1 vertex arrays into the current
// context: the scene's feedback style, base colours and base-colour textures, the scene's
// punctual lights or a head light. Holds the GL objects it made (textures) for the context
// it draws into.
class SceneRenderer {
  public:
    struct Options {
        bool textures = true;  // draw base-colour textures
        bool fast = false;     // playback: the cheapest drawing that still shows the shape
    };

    SceneRenderer();
    ~SceneRenderer();

    // Draws into the current frame buffer's width x height pixels; null scene: background
    // only.
    void Draw(const KLScene* scene, const KLCamera& camera, int width, int height,
              const Options& options);
    // Runs `draw(width, height)` into an offscreen frame buffer of that size and reads the
    // pixels back as a picture (top row first). Null when the context offers no offscreen
    // frame buffer.
    std::unique_ptr<KLImageSGI> DrawOffscreen(int width, int height,
                                              const std::function<void(int, int)>& draw);
    // Frees the GL objects (the context must be current).
    void Release();

    // The background colour, RGB 0..1.
    static const float kBackground[3];

  private:
    void upload_textures(const KLScene& scene);
    void set_lights(const KLScene& scene, const float* view);

    std::vector<unsigned int> textures_;  // GL names per scene texture (0: none)
    const KLScene* textureScene_ = nullptr;
    int textureGeneration_ = -1;
};
