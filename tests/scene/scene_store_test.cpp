#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include "scene/KLWire.h"
#include "scene/KLWireSource.h"
#include "scene/OrDagNode.h"
#include "scene/SceneDocument.h"
#include "scene/scene_util.h"
#include "toolkit/CueTime.h"

namespace {
using Node = std::unique_ptr<OrDagNode>;

struct Keys {
    std::vector<CueTime> times;
    std::vector<float> values;
    std::vector<int> in, out;
    void Add(int ticks, float v, int inCode, int outCode) {
        times.push_back(CueTime::FromTicks(ticks));
        values.push_back(v);
        in.push_back(inCode);
        out.push_back(outCode);
    }
};

int store(OrDagNode* node, int channel, const Keys& k) {
    KLWire::alwaysClearChannel = 1;
    return KLWire::StoreChannel(node, channel, int(k.times.size()), k.times.data(), k.values.data(),
                                k.in.data(), nullptr, k.out.data(), nullptr);
}

// Apply-like keys: smooth, linear and flat tangents mixed, off the frame grid.
Keys mixed_keys(float scale) {
    Keys k;
    k.Add(0, 0, 2, 2);
    k.Add(1000, 1 * scale, 0, 2);
    k.Add(2600, -2 * scale, 1, 0);
    k.Add(6000, 0.5f * scale, 2, 1);
    k.Add(9050, 3 * scale, 0, 2);
    return k;
}

// Every channel of every node of `a` and `b` agrees at every frame from -2 to `frames` and at
// every key time of `a`'s curves.
void expect_same_curves(const SceneDocument& a, const SceneDocument& b, int frames) {
    ASSERT_EQ(a.NodeCount(), b.NodeCount());
    for (int n = 0; n < a.NodeCount(); ++n) {
        for (int c = 0; c < SceneDocument::kChannels; ++c) {
            const ChannelCurve* ca = a.Curve(n, c);
            const ChannelCurve* cb = b.Curve(n, c);
            if (!ca) {
                // A channel of a rewritten node may come back animated with its rest value.
                if (cb) {
                    EXPECT_NEAR(cb->eval(0), a.RestValue(n, c), 1e-4);
                }
                continue;
            }
            ASSERT_TRUE(cb) << a.NodeName(n) << " channel " << c;
            for (int f = -2; f <= frames; ++f) {
                ASSERT_NEAR(ca->eval(f), cb->eval(f), 2e-4)
                    << a.NodeName(n) << " channel " << c << " frame " << f;
            }
            for (const ChannelCurve::Key& k : ca->keys()) {
                ASSERT_NEAR(ca->Evaluate(k.time), cb->Evaluate(k.time), 2e-4)
                    << a.NodeName(n) << " channel " << c << " key " << k.time;
            }
        }
    }
}
}  // namespace

class SceneStore : public ::testing::TestWithParam<const char*> {
  protected:
    void SetUp() override {
        KLWire::Initialize();
        CueTime::default_fps = 30;
        dir_ = MakeTempDir();
        in_ = dir_ + "/face.glb";
        out_ = dir_ + "/out" + GetParam();
        ASSERT_TRUE(MakeFaceScene().Write(in_, TestScene::kBinary));
        source_ = std::make_unique<KLWireSource>(in_.c_str());
        ASSERT_TRUE(source_->Valid()) << source_->ErrorText();
        root_.reset(source_->RootNode());
    }
    Node fetch(const char* name) { return Node(KLWire::FetchDagNode(root_.get(), name)); }
    std::shared_ptr<SceneDocument> reload(const std::string& path) {
        std::string error;
        auto doc = SceneDocument::Load(path, &error);
        EXPECT_TRUE(doc) << error;
        return doc;
    }

    std::string dir_, in_, out_;
    std::unique_ptr<KLWireSource> source_;
    Node root_;
};

TEST_P(SceneStore, StoredChannelsReadBackEqualAtEveryFrameAndKey) {
    Node jaw = fetch("jaw");
    Node lip = fetch("lip#2");
    ASSERT_EQ(store(jaw.get(), 1, mixed_keys(1)), 1);    // TY: mixed tangents
    ASSERT_EQ(store(jaw.get(), 3, mixed_keys(40)), 1);   // RX: rotation, sampled
    ASSERT_EQ(store(jaw.get(), 5, mixed_keys(-25)), 1);  // RZ
    Keys linear;
    linear.Add(0, 1, 1, 1);
    linear.Add(3000, 2, 1, 1);
    ASSERT_EQ(store(lip.get(), 6, linear), 1);  // SX only: lossless LINEAR
    ASSERT_EQ(store(lip.get(), 0, mixed_keys(2)), 1);
    ASSERT_EQ(source_->Store(out_.c_str()), 1);
    auto back = reload(out_);
    ASSERT_TRUE(back);
    expect_same_curves(*source_->document(), *back, 50);
    // Smooth, linear and flat keys really differ from a straight line between keys.
    EXPECT_GT(std::fabs(back->Curve(1, 1)->eval(4) - back->Curve(1, 1)->eval(3)), 0.01);
    std::string report;
    int status = RunValidator(out_, &report);
    if (status == -1) {
        GTEST_SKIP() << "node is not installed";
    }
    EXPECT_EQ(status, 0) << report;
    EXPECT_NE(report.find(": 0 errors"), std::string::npos) << report;
}

TEST_P(SceneStore, UntouchedDataIsWrittenBackUnchanged) {
    Node jaw = fetch("jaw");
    ASSERT_EQ(store(jaw.get(), 0, mixed_keys(1)), 1);
    ASSERT_EQ(source_->Store(out_.c_str()), 1);
    auto back = reload(out_);
    ASSERT_TRUE(back);
    const tinygltf::Model& m = back->model();
    // Mesh positions, node extras, the second animation and the brow's cubic curve.
    ASSERT_EQ(m.meshes.size(), 1u);
    std::vector<float> positions;
    int pos = m.meshes[0].primitives[0].attributes.at("POSITION");
    const tinygltf::Accessor& a = m.accessors[size_t(pos)];
    const tinygltf::BufferView& v = m.bufferViews[size_t(a.bufferView)];
    positions.resize(9);
    std::memcpy(positions.data(),
                m.buffers[size_t(v.buffer)].data.data() + v.byteOffset + a.byteOffset, 36);
    EXPECT_EQ(positions, (std::vector<float>{0, 0, 0, 1, 0, 0, 0, 1, 0}));
    EXPECT_EQ(a.maxValues, (std::vector<double>{1, 1, 0}));
    EXPECT_EQ(m.nodes[0].extras.Get<std::string>(), "kept");
    ASSERT_EQ(m.animations.size(), 2u);
    EXPECT_EQ(m.animations[0].name, "shapes");
    EXPECT_EQ(m.animations[1].name, "other");
    EXPECT_EQ(m.animations[1].samplers.size(), 1u);
    expect_same_curves(*source_->document(), *back, 40);
    // The jaw's old translation and rotation samplers were replaced, not kept beside the new.
    int jawChannels = 0;
    for (const auto& c : m.animations[0].channels) {
        jawChannels += c.target_node == 1;
    }
    EXPECT_EQ(jawChannels, 2);
}

TEST_P(SceneStore, RepeatedStoresDoNotGrowTheFile) {
    Node jaw = fetch("jaw");
    ASSERT_EQ(store(jaw.get(), 1, mixed_keys(1)), 1);
    ASSERT_EQ(source_->Store(out_.c_str()), 1);
    auto buffer_bytes = [&]() {
        auto doc = reload(out_);
        size_t n = 0;
        for (const auto& b : doc->model().buffers) {
            n += b.data.size();
        }
        return std::make_pair(n, doc->model().accessors.size());
    };
    auto first = buffer_bytes();
    for (int round = 0; round < 3; ++round) {
        KLWireSource again(out_.c_str());
        ASSERT_TRUE(again.Valid()) << again.ErrorText();
        Node root(again.RootNode());
        Node j(KLWire::FetchDagNode(root.get(), "jaw"));
        ASSERT_EQ(store(j.get(), 1, mixed_keys(1)), 1);
        ASSERT_EQ(again.Store(out_.c_str()), 1);
        auto now = buffer_bytes();
        // Alignment padding may move by a few bytes; the old animation data never stays.
        EXPECT_LE(now.first, first.first + 16) << "round " << round;
        EXPECT_EQ(now.second, first.second) << "round " << round;
    }
}

INSTANTIATE_TEST_SUITE_P(Formats, SceneStore, ::testing::Values(".glb", ".gltf"),
                         [](const ::testing::TestParamInfo<const char*>& info) {
                             return std::string(info.param + 1);
                         });

TEST(SceneStoreEdges, MergeClearRejectAndNewAnimation) {
    KLWire::Initialize();
    CueTime::default_fps = 30;
    std::string dir = MakeTempDir();
    // A scene without animation and a node placed by a matrix.
    TestScene s;
    int n = s.AddNode("box");
    s.model.nodes[size_t(n)].matrix = {2, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 5, 6, 7, 1};
    s.AddTriangle(n);
    ASSERT_TRUE(s.Write(dir + "/box.gltf", TestScene::kEmbedded));
    KLWireSource src((dir + "/box.gltf").c_str());
    ASSERT_TRUE(src.Valid()) << src.ErrorText();
    Node root(src.RootNode());
    Node box(KLWire::FetchDagNode(root.get(), "box"));
    EXPECT_EQ(KLWire::FindChannel(box.get(), 0), nullptr);

    Keys k;
    k.Add(0, 1, 1, 1);
    k.Add(6000, 2, 1, 1);
    ASSERT_EQ(store(box.get(), 1, k), 1);
    // Without clearing, new keys merge into the curve.
    KLWire::alwaysClearChannel = 0;
    CueTime t = CueTime::FromTicks(3000);
    float v = 10;
    int lin = 1;
    ASSERT_EQ(KLWire::StoreChannel(box.get(), 1, 1, &t, &v, &lin, nullptr, &lin, nullptr), 1);
    EXPECT_NEAR(KLWire::FindChannel(box.get(), 1)->eval(15), 10, 1e-9);
    EXPECT_NEAR(KLWire::FindChannel(box.get(), 1)->eval(30), 2, 1e-9);
    // NaN values are refused and leave the curve alone; no keys remove it.
    float nan = std::nanf("");
    EXPECT_EQ(KLWire::StoreChannel(box.get(), 1, 1, &t, &nan, &lin, nullptr, &lin, nullptr), 0);
    EXPECT_EQ(KLWire::StoreChannel(root.get(), 1, 1, &t, &v, &lin, nullptr, &lin, nullptr), 0);
    EXPECT_EQ(KLWire::StoreChannel(box.get(), 9, 1, &t, &v, &lin, nullptr, &lin, nullptr), 0);
    KLWire::alwaysClearChannel = 1;
    ASSERT_EQ(KLWire::StoreChannel(box.get(), 2, 1, &t, &v, &lin, nullptr, &lin, nullptr), 1);
    ASSERT_EQ(
        KLWire::StoreChannel(box.get(), 2, 0, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr),
        1);
    EXPECT_EQ(KLWire::FindChannel(box.get(), 2), nullptr);

    ASSERT_EQ(src.Store((dir + "/box-out.glb").c_str()), 1);
    std::string error;
    auto back = SceneDocument::Load(dir + "/box-out.glb", &error);
    ASSERT_TRUE(back) << error;
    ASSERT_EQ(back->model().animations.size(), 1u);
    EXPECT_EQ(back->model().animations[0].name, "chirrup");
    EXPECT_TRUE(back->model().nodes[0].matrix.empty());  // animated nodes carry TRS
    EXPECT_NEAR(back->RestValue(0, 6), 2, 1e-9);
    EXPECT_NEAR(back->Curve(0, 0)->eval(15), 5, 1e-6);  // the matrix's translation
    EXPECT_NEAR(back->Curve(0, 1)->eval(15), 10, 1e-5);
    std::string report;
    int status = RunValidator(dir + "/box-out.glb", &report);
    if (status != -1) {
        EXPECT_EQ(status, 0) << report;
    }
}

TEST(SceneStoreEdges, FailedStoreNamesTheFileAndKeepsTheOldOne) {
    std::string dir = MakeTempDir();
    ASSERT_TRUE(MakeFaceScene().Write(dir + "/face.glb", TestScene::kBinary));
    KLWireSource src((dir + "/face.glb").c_str());
    ASSERT_TRUE(src.Valid());
    std::string bad = dir + "/no/such/dir/out.glb";
    testing::internal::CaptureStderr();
    EXPECT_EQ(src.Store(bad.c_str()), 0);
    std::string err = testing::internal::GetCapturedStderr();
    EXPECT_NE(err.find(bad), std::string::npos) << err;
    // Storing over an existing file replaces it whole; no temporary file is left behind.
    std::string before = ReadFile(dir + "/face.glb");
    ASSERT_EQ(src.Store((dir + "/face.glb").c_str()), 1);
    std::string error;
    EXPECT_TRUE(SceneDocument::Load(dir + "/face.glb", &error)) << error;
    std::string ls = dir + "/face.glb.";
    EXPECT_FALSE(std::ifstream(ls + "XXXXXX").good());
    KLWireSource invalid((dir + "/missing.glb").c_str());
    testing::internal::CaptureStderr();
    EXPECT_EQ(invalid.Store((dir + "/x.glb").c_str()), 0);
    EXPECT_NE(testing::internal::GetCapturedStderr().find("x.glb"), std::string::npos);
    EXPECT_FALSE(std::ifstream(dir + "/x.glb").good());
    (void)before;
}
