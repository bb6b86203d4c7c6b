#pragma once

#include "scene/Mat4.h"

struct ScenePrimitive;
struct SceneMaterial;

// One primitive of one mesh node as the views draw it at the scene's evaluated time: the
// vertex arrays (deformed by skin and morph targets when the mesh has them) and the matrix
// that places them in the world (the identity when the deformation already did).
struct SceneDrawItem {
    int node = -1;
    const ScenePrimitive* primitive = nullptr;
    const SceneMaterial* material = nullptr;  // never null
    Mat4 world;
    const float* positions = nullptr;  // 3 per vertex
    const float* normals = nullptr;    // 3 per vertex
};
