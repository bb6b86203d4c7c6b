// Feeds arbitrary bytes to the scene loader, as a binary .glb and as .gltf text, then walks the
// node hierarchy the way extraction does and evaluates every animated channel.
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "scene/KLWire.h"
#include "scene/KLWireSetting.h"
#include "scene/OrDagNode.h"
#include "scene/SceneDocument.h"
#include "toolkit/CueTime.h"

namespace {
double walk(OrDagNode* node, int depth) {
    double sum = 0;
    for (int c = 0; c < SceneDocument::kChannels; ++c) {
        if (OrChannel* ch = KLWire::FindChannel(node, c)) {
            for (double f = -1; f <= 4; f += 0.5) {
                sum += ch->eval(f);
            }
        }
    }
    if (depth < 64 && node->asGroupNodePtr()) {
        for (std::unique_ptr<OrDagNode> child = node->childNode(); child;
             child = child->nextNode()) {
            sum += walk(child.get(), depth + 1);
        }
    }
    return sum;
}

void run(const uint8_t* data, size_t size) {
    std::string error;
    auto doc = SceneDocument::LoadFromMemory(data, size, "fuzz", &error);
    if (!doc) {
        return;
    }
    OrDagNode root(doc, -1);
    volatile double sink = walk(&root, 0);
    (void)sink;
    std::unique_ptr<KLDagList> list = KLWire::BuildDagList(&root, 1);
    for (const auto& n : list->nodes) {
        KLWire::UniqueDagName(&root, n->name());
    }
    // Replace two channels of the first node and write the scene out and back in: the writer
    // renumbers accessors and buffer views of whatever the loader accepted.
    if (list->nodes.size() > 1) {
        CueTime times[3] = {CueTime::FromTicks(0), CueTime::FromTicks(700),
                            CueTime::FromTicks(3000)};
        float values[3] = {0.0f, 1.5f, -2.0f};
        int in[3] = {0, 1, 2}, out[3] = {2, 0, 1};
        KLWireSetting clear(KLWireSetting::kAlwaysClearChannel);
        OrDagNode* node = list->nodes[1].get();
        KLWire::StoreChannel(node, 1, 3, times, values, in, nullptr, out, nullptr);
        KLWire::StoreChannel(node, 4, 3, times, values, in, nullptr, out, nullptr);
        static const std::string path = "/tmp/scene_fuzz_" + std::to_string(getpid()) + ".glb";
        if (doc->Store(path, &error)) {
            auto back = SceneDocument::Load(path, &error);
            if (!back) {
                __builtin_trap();  // what was written must read back
            }
        }
    }
}
}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size > (1u << 20)) {
        return 0;
    }
    run(data, size);
    // The same bytes as the JSON chunk of a .glb, so that mutations of JSON text also reach the
    // binary path.
    uint32_t jsonLength = uint32_t((size + 3) & ~size_t(3));
    std::vector<uint8_t> glb(20 + size_t(jsonLength), ' ');
    uint32_t header[4] = {2, uint32_t(glb.size()), jsonLength, 0x4E4F534A};
    std::memcpy(glb.data(), "glTF", 4);
    std::memcpy(glb.data() + 4, header, sizeof header);
    if (size > 0) {
        std::memcpy(glb.data() + 20, data, size);
    }
    run(glb.data(), glb.size());
    return 0;
}
