// SafeFile: the target is its old self or the complete new content, whatever happens to the
// process on the way, and no temporary file outlives the save. Saves that must be stopped
// part-way run in a child process that is killed (SIGKILL: nothing runs on the way out).

#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fstream>

#include "toolkit/SafeFile.h"
#include "toolkit_test_util.h"

namespace fs = std::filesystem;

namespace {

using Stage = SafeFile::Stage;

// The names in `dir`, sorted.
std::vector<std::string> Listing(const fs::path& dir) {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(dir))
        names.push_back(entry.path().filename().string());
    std::sort(names.begin(), names.end());
    return names;
}

// The permission bits of `path` (0 when it is missing).
unsigned Mode(const std::string& path) {
    struct stat st {};
    return ::stat(path.c_str(), &st) == 0 ? st.st_mode & 07777 : 0u;
}

Stage kill_at;  // the stage at which the child's save is killed
void KillAtStage(Stage stage) {
    if (stage == kill_at)
        ::raise(SIGKILL);
}

// Every case runs with unnamed files (the usual way on Linux) and with named temporary files
// (file systems without them).
class SafeFileTest : public TempDirTest, public ::testing::WithParamInterface<bool> {
  protected:
    void SetUp() override {
        TempDirTest::SetUp();
        SafeFile::SetUnnamedFilesAllowed(GetParam());
        target_ = Path("a.track");
    }
    void TearDown() override {
        SafeFile::SetUnnamedFilesAllowed(true);
        TempDirTest::TearDown();
    }
    std::string target_;
};

// A new file gets the usual permissions and all its content (more than the stream's buffer,
// in pieces that set the disk writing part-way; writers that need a file name go through the
// descriptor path, as pictures do); a save that is abandoned changes nothing; a replaced file
// keeps its permissions.
TEST_P(SafeFileTest, CommitsWholeContentKeepingThePermissions) {
    const mode_t old = ::umask(027);
    std::string first(9 << 20, 'x');
    first[12345] = '\n';
    first[(6 << 20) + 7] = 'y';
    SafeFile created(target_);
    created.Stream() << "head ";
    for (size_t at = 0; at < first.size(); at += 3 << 20)
        created.Stream().write(first.data() + at, std::streamsize(3 << 20));
    const bool committed = created.Commit();
    ::umask(old);
    ASSERT_TRUE(committed) << created.ErrorText();
    first = "head " + first;
    EXPECT_TRUE(Slurp(target_) == first);
    EXPECT_EQ(Mode(target_), 0640u);
    ::chmod(target_.c_str(), 0604);
    {
        SafeFile abandoned(target_);
        ASSERT_TRUE(abandoned.IsOpen()) << abandoned.ErrorText();
        abandoned.Stream() << "abandoned";
    }
    EXPECT_TRUE(Slurp(target_) == first) << "abandoned";
    EXPECT_EQ(Listing(dir_), std::vector<std::string>{"a.track"});
    SafeFile file(target_);
    file.Stream() << "new\n";
    EXPECT_TRUE(file.Write("\0bytes", 6));
    EXPECT_TRUE(Slurp(target_) == first) << "nothing changes before Commit";
    EXPECT_TRUE(file.Commit()) << file.ErrorText();
    EXPECT_FALSE(file.IsOpen());
    EXPECT_FALSE(file.Commit()) << "a SafeFile commits once";
    EXPECT_EQ(Slurp(target_), std::string("new\n\0bytes", 10));
    EXPECT_EQ(Mode(target_), 0604u) << "the replaced file's permissions are kept";
    EXPECT_EQ(Listing(dir_), std::vector<std::string>{"a.track"});
}

TEST_P(SafeFileTest, ANameThatCannotBeWrittenSaysWhyAndOthersFilesStay) {
    for (const std::string& path : {Path("no-such-dir/a.keyset"), dir_.string(), std::string()}) {
        SafeFile file(path);
        EXPECT_FALSE(file.IsOpen()) << path;
        EXPECT_FALSE(file.ErrorText().empty()) << path;
        file.Stream() << "lost";  // harmless
        EXPECT_FALSE(file.Write("x", 1));
        EXPECT_FALSE(file.Commit());
    }
    EXPECT_TRUE(Listing(dir_).empty());
    // Temporary files of a live process and of other targets are not a killed save's.
    std::ofstream(target_) << "old\n";
    const std::string mine = Path(".a.track.tmp-" + std::to_string(::getpid()) + "-abcdef");
    const std::string other = Path(".b.track.tmp-999999999-abcdef");
    std::ofstream(mine) << "in use";
    std::ofstream(other) << "another target's";
    SafeFile file(target_);
    EXPECT_TRUE(fs::exists(mine)) << "a save still running owns it";
    EXPECT_TRUE(fs::exists(other)) << "another target's files are its own saves' business";
}

// Blocks written together (hundreds, some empty) land in order between what the stream wrote
// before and after them.
TEST_P(SafeFileTest, GatheredBlocksLandInOrderBetweenTheStreamsWrites) {
    std::vector<std::string> texts;
    std::string expected = "head ";
    for (int i = 0; i < 600; ++i) {
        texts.push_back(std::string(size_t(i % 7) * 300, char('a' + i % 26)));
        expected += texts.back();
    }
    std::vector<struct iovec> blocks;
    for (std::string& t : texts)
        blocks.push_back({t.data(), t.size()});
    SafeFile file(target_);
    file.Stream() << "head ";
    EXPECT_TRUE(file.WriteGathered(blocks.data(), blocks.size()));
    file.Stream() << " tail";
    ASSERT_TRUE(file.Commit()) << file.ErrorText();
    EXPECT_TRUE(Slurp(target_) == expected + " tail");
}

TEST_P(SafeFileTest, AFailedWriteFailsTheCommitAndLeavesTheTargetAlone) {
    std::ofstream(target_) << "old\n";
    // A file-size limit makes the writes fail part-way (EFBIG instead of the signal), through
    // the stream and through gathered blocks (a short write, then the failure).
    for (bool gathered : {false, true}) {
        const int status = InChild([&] {
            ::signal(SIGXFSZ, SIG_IGN);
            struct rlimit limit = {1 << 16, 1 << 16};
            ::setrlimit(RLIMIT_FSIZE, &limit);
            SafeFile file(target_);
            std::string bytes(1 << 18, 'y');
            if (gathered) {
                struct iovec blocks[4];
                for (int i = 0; i < 4; ++i)
                    blocks[i] = {bytes.data() + i * (1 << 16), size_t(1) << 16};
                if (file.WriteGathered(blocks, 4))
                    ::_exit(3);
            } else {
                file.Stream() << bytes;
            }
            const bool committed = file.Commit();
            const bool named = file.ErrorText().find("could not write all of") == 0;
            ::_exit(committed ? 1 : named ? 0 : 2);
        });
        ASSERT_TRUE(WIFEXITED(status));
        EXPECT_EQ(WEXITSTATUS(status), 0)
            << "1: committed anyway, 2: no reason given, 3: the blocks said they were written";
        EXPECT_EQ(Slurp(target_), "old\n");
        EXPECT_EQ(Listing(dir_), std::vector<std::string>{"a.track"});
    }
}

// A save killed part-way, over an existing file and into a new one: the target is complete
// (old or new) and, once another save of it has begun, nothing else is in the directory.
// With unnamed files nothing else is there even straight after the kill, up to the link.
TEST_P(SafeFileTest, AKilledSaveLeavesTheOldOrTheNewFileAndNoOther) {
    const std::string fresh = Path("b.track");
    std::ofstream(target_) << "old\n";
    const std::string content(1 << 20, 'n');
    for (Stage stage :
         {Stage::Opened, Stage::Written, Stage::Synced, Stage::Linked, Stage::Renamed}) {
        SCOPED_TRACE(int(stage));
        for (const std::string& path : {target_, fresh}) {
            const std::string before = fs::exists(path) ? Slurp(path) : "";
            kill_at = stage;
            const int status = InChild([&] {
                SafeFile::SetStageHook(KillAtStage);
                SafeFile file(path);
                file.Stream() << content;
                file.Commit();
            });
            ASSERT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL) << path;
            const std::string now = fs::exists(path) ? Slurp(path) : "";
            // A new file with unnamed files needs no temporary name: the link puts it in place.
            const bool placed =
                stage == Stage::Renamed || (stage == Stage::Linked && GetParam() && path == fresh);
            EXPECT_EQ(now, placed ? content : before) << path;
            const size_t files = fs::exists(target_) + fs::exists(fresh);
            if (GetParam() && stage < Stage::Linked) {
                EXPECT_EQ(Listing(dir_).size(), files) << "nothing left by the killed save";
            }
            SafeFile next(path);  // removes what the killed save left
            EXPECT_EQ(Listing(dir_).size(), files + !GetParam());
        }
        EXPECT_EQ(Slurp(target_), stage == Stage::Renamed ? content : "old\n");
        std::ofstream(target_) << "old\n";
        fs::remove(fresh);
    }
}

INSTANTIATE_TEST_SUITE_P(Unnamed, SafeFileTest, ::testing::Values(true));
INSTANTIATE_TEST_SUITE_P(Named, SafeFileTest, ::testing::Values(false));

}  // namespace
