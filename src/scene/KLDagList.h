#pragma once

#include <memory>
#include <vector>

#include "scene/OrDagNode.h"

// A list of the nodes of a scene, built by KLWire::BuildDagList; it owns its handles.
struct KLDagList {
    std::vector<std::unique_ptr<OrDagNode>> nodes;
};
