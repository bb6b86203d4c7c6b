#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdlib>
#include <fstream>
#include <memory>

#include "toolkit/CuePrefs.h"
#include "toolkit/KLErrHandler.h"
#include "toolkit/KLFilePath.h"
#include "toolkit/KLSkipList.h"
#include "toolkit/KLString.h"

namespace {

TEST(KLQuote, QuotesOnlyWhatWouldSplit) {
    EXPECT_EQ(KLQuote("jaw"), "jaw");
    EXPECT_EQ(KLQuote("open jaw"), "\"open jaw\"");
    EXPECT_EQ(KLQuote("tab\tname"), "\"tab\tname\"");
    EXPECT_EQ(KLQuote(""), "\"\"") << "an empty name must stay a token";
    EXPECT_EQ(KLQuote(nullptr), "\"\"");
    EXPECT_EQ(KLQuote("a b", '<', '>'), "<a b>");
    EXPECT_EQ(KLQuote("a,b", '"', '"', ","), "\"a,b\"");
}

TEST(KLString, NewStringAndFmt) {
    std::unique_ptr<char[]> copy(KLNewString("mouth"));
    EXPECT_STREQ(copy.get(), "mouth");
    EXPECT_EQ(KLNewString(nullptr), nullptr);
    EXPECT_EQ(KLFmt("Maximum keysets [%d] reached.", 10), "Maximum keysets [10] reached.");
    EXPECT_EQ(KLFmt("%s", std::string(5000, 'a').c_str()).size(), 5000u);
}

TEST(KLFilePath, TrimHeadRemovesOnlyAWholeDirectory) {
    EXPECT_EQ(KLFilePath::TrimHead("/proj/pix/mouth.0012.sgi", "/proj/pix"), "mouth.0012.sgi");
    EXPECT_EQ(KLFilePath::TrimHead("/proj/pix/mouth.sgi", "/proj/pix/"), "mouth.sgi");
    EXPECT_EQ(KLFilePath::TrimHead("/proj/pixels/a.sgi", "/proj/pix"), "/proj/pixels/a.sgi");
    EXPECT_EQ(KLFilePath::TrimHead("rel/a.sgi", nullptr), "rel/a.sgi");
    EXPECT_EQ(KLFilePath::TrimHead("/a.sgi", "/"), "a.sgi");
    EXPECT_EQ(KLFilePath::TrimHead("/proj/pix", "/proj/pix"), "");
}

TEST(KLFilePath, JoinAndSplit) {
    EXPECT_EQ(KLFilePath::Join("/proj/wire", "face.glb"), "/proj/wire/face.glb");
    EXPECT_EQ(KLFilePath::Join("/proj/wire", "/abs/face.glb"), "/abs/face.glb");
    EXPECT_EQ(KLFilePath::Join(nullptr, "face.glb"), "face.glb");
    EXPECT_EQ(KLFilePath::Directory("/proj/misc_data/a.kset"), "/proj/misc_data");
    EXPECT_EQ(KLFilePath::Directory("a.kset"), ".");
    EXPECT_EQ(KLFilePath::Directory("/a.kset"), "/");
    EXPECT_EQ(KLFilePath::Basename("/proj/misc_data"), "misc_data");
}

TEST(KLFilePath, ExistsAndReadable) {
    char dir[] = "/tmp/chirrup-pathXXXXXX";
    ASSERT_NE(mkdtemp(dir), nullptr);
    const std::string file = std::string(dir) + "/f";
    std::ofstream(file) << "x";
    EXPECT_TRUE(KLFilePath::Exists(file.c_str()));
    EXPECT_TRUE(KLFilePath::IsReadable(file.c_str()));
    EXPECT_TRUE(KLFilePath::IsDirectory(dir));
    EXPECT_FALSE(KLFilePath::Exists((file + "nope").c_str()));
    EXPECT_FALSE(KLFilePath::IsReadable(nullptr));
    std::remove(file.c_str());
    rmdir(dir);
}

struct Item {
    int key;
    static int Compare(const void* a, const void* b) {
        const int x = static_cast<const Item*>(a)->key, y = static_cast<const Item*>(b)->key;
        return x == y ? 0 : (x < y ? -1 : 1);
    }
};

TEST(KLSkipList, OrderedUniqueWithNeighbourSearches) {
    KLSkipList<Item> list(Item::Compare);
    Item a{10}, b{20}, c{30}, dup{20};
    EXPECT_EQ(list.Insert(&b), &b);
    EXPECT_EQ(list.Insert(&c), &c);
    EXPECT_EQ(list.Insert(&a), &a);
    EXPECT_EQ(list.Insert(&dup), nullptr) << "an occupied key is refused";
    EXPECT_EQ(list.Count(), 3);
    EXPECT_EQ(list.Head(), &a);
    EXPECT_EQ(list.Tail(), &c);
    EXPECT_EQ(list.Next(&a), &b);
    EXPECT_EQ(list.Next(&c), nullptr);
    EXPECT_EQ(list.Prev(&b), &a);
    Item probe{25};
    EXPECT_EQ(list.Search(&probe), &b) << "greatest not above";
    EXPECT_EQ(list.Following(&probe), &c);
    probe.key = 20;
    EXPECT_EQ(list.Search(&probe), &b) << "equal counts as not above";
    EXPECT_EQ(list.Following(&probe), &c);
    probe.key = 5;
    EXPECT_EQ(list.Search(&probe), nullptr);
    EXPECT_EQ(list.Following(&probe), &a);
    EXPECT_EQ(list.Remove(&dup), &b) << "removes the element equal to the probe";
    EXPECT_EQ(list.Remove(&dup), nullptr);
    list.Clear();
    EXPECT_TRUE(list.Empty());
    EXPECT_EQ(list.Head(), nullptr);
}

// Restores the environment and the cached directories after each preference test.
class CuePrefsTest : public ::testing::Test {
  protected:
    void SetUp() override {
        save("TESSEL_PROJECT", project_);
        save("TESSEL_MISC_DIR", misc_);
    }
    void TearDown() override {
        restore("TESSEL_PROJECT", project_);
        restore("TESSEL_MISC_DIR", misc_);
        CuePrefs::Refresh();
    }
    static void save(const char* name, std::unique_ptr<std::string>& slot) {
        if (const char* v = std::getenv(name))
            slot = std::make_unique<std::string>(v);
    }
    static void restore(const char* name, const std::unique_ptr<std::string>& slot) {
        if (slot)
            setenv(name, slot->c_str(), 1);
        else
            unsetenv(name);
    }
    std::unique_ptr<std::string> project_, misc_;
};

TEST_F(CuePrefsTest, NoProjectMeansNoDirectories) {
    unsetenv("TESSEL_PROJECT");
    CuePrefs::Refresh();
    EXPECT_EQ(CuePrefs::Project(), nullptr);
    EXPECT_EQ(CuePrefs::WorkEnv(), nullptr);
    EXPECT_EQ(CuePrefs::MiscDir(), nullptr);
    EXPECT_EQ(CuePrefs::WireDir(), nullptr);
    EXPECT_EQ(CuePrefs::PixDir(), nullptr);
    EXPECT_NE(CuePrefs::Location(), nullptr);
}

TEST_F(CuePrefsTest, ProjectDirectoriesFollowTheEnvironmentAndSetProject) {
    setenv("TESSEL_PROJECT", "/show/shot1/", 1);
    unsetenv("TESSEL_MISC_DIR");
    CuePrefs::Refresh();
    EXPECT_STREQ(CuePrefs::WorkEnv(), "/show/shot1");
    EXPECT_STREQ(CuePrefs::MiscDir(), "/show/shot1/misc_data");
    EXPECT_STREQ(CuePrefs::WireDir(), "/show/shot1/wire");
    EXPECT_STREQ(CuePrefs::PixDir(), "/show/shot1/pix");

    setenv("TESSEL_MISC_DIR", "data", 1);
    CuePrefs::SetProject("/show/shot2");
    EXPECT_STREQ(CuePrefs::MiscDir(), "/show/shot2/data");
    EXPECT_STREQ(std::getenv("TESSEL_PROJECT"), "/show/shot2") << "exported for child programs";

    CuePrefs::SetProject(nullptr);
    EXPECT_EQ(CuePrefs::MiscDir(), nullptr);
    EXPECT_EQ(CuePrefs::Variable("TESSEL_PROJECT"), nullptr);
}

// Collects what reaches it.
class Collector : public KLErrHandler {
  public:
    void Handle(KLErr* e) override {
        if (e->Level() >= outputLevel)
            seen += e->Message();
    }
    std::string seen;
};

TEST(KLErrHandler, ReportsReachTheInstalledHandlerByLevel) {
    const int saved = KLErrHandler::outputLevel;
    {
        Collector c;
        KLStatus("status %d;", 1);
        KLInform("info;");
        KLWarning("warn %s;", "w");
        KLError("error;");
        EXPECT_EQ(c.seen, "warn w;error;") << "the default level shows warnings and errors";
        c.seen.clear();
        KLErrHandler::outputLevel = 2;
        KLStatus("status;");
        KLInform("info;");
        EXPECT_EQ(c.seen, "status;info;");
        {
            Collector inner;
            KLError("inner;");
            EXPECT_EQ(inner.seen, "inner;");
        }
        KLError("outer;");
        EXPECT_EQ(c.seen, "status;info;outer;") << "the previous handler is back";
    }
    KLErrHandler::outputLevel = saved;
    EXPECT_EQ(KLErrHandler::Current(), nullptr);
}

TEST(KLErrHandler, StatusHookSeesEveryStatus) {
    std::string got;
    KLErrHandler::SetStatusHook([](const char* m, void* d) { *static_cast<std::string*>(d) += m; },
                                &got);
    KLStatus("Reading wire file [%s].", "face.glb");
    KLInform("not a status");
    KLErrHandler::SetStatusHook(nullptr, nullptr);
    KLStatus("after");
    EXPECT_EQ(got, "Reading wire file [face.glb].");
}

}  // namespace
