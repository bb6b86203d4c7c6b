#pragma once

#include <string>
#include <vector>

// Small generated glTF scenes for the view tests and benchmarks (see README.md).
namespace testscenes {

// A sheet of columns x rows quads, 2 m square in the XY plane, centred on the origin, facing +Z.
struct Sheet {
    explicit Sheet(int columns = 1, int rows = 1, int joints = 0, int morphTargets = 0)
        : columns(columns), rows(rows), joints(joints), morphTargets(morphTargets) {}
    int columns, rows;
    int joints;        // a chain along X; each vertex follows the joint of its column band
    int morphTargets;  // target k lifts a quarter-wide band from column k * columns / targets
                       // by (0, 0.5, 0.5)
    std::vector<float> morphWeights;  // the mesh's default weights (zeros when empty)
    int animatedFrames = 0;           // animation "shapes": STEP joint turns at frames 0..N-1
    bool backSheet = false;           // a second sheet 0.5 m behind, facing away
    bool texture = false;             // a 2 x 2 red and blue checker as base colour texture
};

// Writes the sheet scene as .gltf (embedded) or .glb by the path's ending; true on success.
bool WriteSheet(const std::string& path, const Sheet& sheet);

}  // namespace testscenes
