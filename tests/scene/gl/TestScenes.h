#pragma once

#include <string>
#include <vector>

// Small generated glTF scenes for the view tests and benchmarks (see README.md).
namespace testscenes {

// A flat sheet of columns x rows quads in the XY plane, centred on the origin and facing +Z
// (the default camera looks at it from the front), under a mesh node "sheet".
struct Sheet {
    int columns = 1;
    int rows = 1;
    float width = 2.0f;   // metres along X
    float height = 2.0f;  // metres along Y
    float colour[4] = {0.9f, 0.6f, 0.2f, 1.0f};
    // Skin: a chain of joints "joint0".."jointN-1" along X, joint j standing at the left
    // edge of the j-th of N equal column bands; each vertex follows the joint of its band
    // with weight 1.
    int joints = 0;
    // Morph targets: target k moves the vertices of a quarter-wide band of columns, starting
    // at column k * columns / targets, by (0, 0, 0.5) ... and upwards by `morphLift`.
    int morphTargets = 0;
    float morphLift = 0.5f;
    std::vector<float> morphWeights;  // the mesh's default weights (zeros when empty)
    // An animation "shapes" turning every joint about Z at each of frames 0..N-1 (30 fps,
    // STEP), by (j + 1) * frame / 4 degrees for joint j: N poses for key shapes.
    int animatedFrames = 0;
    // An animation "weights" of the sheet's morph weights: key times (s) and weights per key.
    std::vector<float> weightTimes;
    std::vector<float> weightValues;
    // A second sheet behind the first (z = -0.5), facing away from the camera, drawn only
    // when back faces are.
    bool backSheet = false;
    // A 2 x 2 checker texture (red and blue) as the base colour texture.
    bool texture = false;
    // The texture image replaced by bytes that are not a picture.
    bool corruptTexture = false;
    // Named extra nodes with a translation, for lights and cameras.
    bool headLightOnly = true;  // false: a red directional light shining along -Z
};

// Writes the sheet scene as .gltf (embedded) or .glb by the path's ending; true on success.
bool WriteSheet(const std::string& path, const Sheet& sheet);

}  // namespace testscenes
