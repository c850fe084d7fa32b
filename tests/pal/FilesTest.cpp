// Files and directories of the platform layer against a real host folder.
#include <KD/kdext.h>
#include <gtest/gtest.h>
#include <pal/Simulation.h>
#include <stdlib.h>

#include <algorithm>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <functional>
#include <set>
#include <string>
#include <thread>
#include <tuple>
#include <vector>

namespace {

namespace fs = std::filesystem;

// A fresh host folder per test holding the platform root ("<base>/root")
// and, beside it, a file that no platform path may reach.
class FilesTest : public ::testing::Test {
protected:
    void SetUp() override {
        char pattern[] = "/tmp/pal-files-test.XXXXXX";
        ASSERT_NE(mkdtemp(pattern), nullptr);
        base = pattern;
        root = base / "root";
        fs::create_directory(root);
        writeHostFile(base / "victim", "outside");
        pal::setFileRoot(root.string());
    }

    void TearDown() override {
        pal::setFileRoot("");
        fs::remove_all(base);
    }

    static void writeHostFile(const fs::path& path, const std::string& text) {
        std::ofstream(path, std::ios::binary) << text;
    }

    static std::string readHostFile(const fs::path& path) {
        std::ifstream in(path, std::ios::binary);
        return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
    }

    static std::set<std::string> hostEntries(const fs::path& folder) {
        std::set<std::string> names;
        for (const auto& entry : fs::directory_iterator(folder)) {
            names.insert(entry.path().filename().string());
        }
        return names;
    }

    static void writeFile(const char* path, const std::string& text) {
        KDFile* file = kdFopen(path, "wb");
        ASSERT_NE(file, nullptr) << path;
        ASSERT_EQ(kdFwrite(text.data(), 1, text.size(), file), text.size());
        ASSERT_EQ(kdFclose(file), 0);
    }

    static std::vector<std::string> listDir(const char* path) {
        std::vector<std::string> names;
        KDDir* dir = kdOpenDir(path);
        if (dir == nullptr) {
            return names;
        }
        while (KDDirent* entry = kdReadDir(dir)) {
            names.push_back(entry->d_name);
        }
        kdCloseDir(dir);
        std::sort(names.begin(), names.end());
        return names;
    }

    fs::path base;
    fs::path root;
};

TEST_F(FilesTest, PathsLeavingTheRootAreRefusedBeforeAnyHostCall) {
    fs::create_directories(root / "data" / "a");
    writeHostFile(root / "data" / "inside", "inside");
    const char* escapes[] = {
        "../victim",   "/../victim", "a/../../victim", "/data/../../victim", "/data/a/../../../victim",
        "./../victim", "..",         "/data/..",       "/data/../inside"};
    for (const char* path : escapes) {
        SCOPED_TRACE(path);
        EXPECT_EQ(pal::hostPath(path), "");
        KDStat st;
        const std::vector<std::pair<const char*, std::function<bool()>>> refusals = {
            {"fopen r", [&] { return kdFopen(path, "rb") == nullptr; }},
            {"fopen w", [&] { return kdFopen(path, "wb") == nullptr; }},
            {"fopen a", [&] { return kdFopen(path, "ab") == nullptr; }},
            {"stat", [&] { return kdStat(path, &st) == -1; }},
            {"access", [&] { return kdAccess(path, 0) == -1; }},
            {"remove", [&] { return kdRemove(path) == -1; }},
            {"rmdir", [&] { return kdRmdir(path) == -1; }},
            {"mkdir", [&] { return kdMkdir(path) == -1; }},
            {"mkdirall", [&] { return kdMkdirAllZVR(path) == -1; }},
            {"truncate", [&] { return kdTruncate(path, 0) == -1; }},
            {"opendir", [&] { return kdOpenDir(path) == nullptr; }},
            {"rename from", [&] { return kdRename(path, "/data/moved") == -1; }},
            {"rename to", [&] { return kdRename("/data/inside", path) == -1; }},
        };
        for (const auto& [call, refused] : refusals) {
            kdSetError(0);
            EXPECT_TRUE(refused()) << call;
            EXPECT_EQ(kdGetError(), KD_EACCES) << call;
        }
    }
    // The root itself is no more reachable than what lies above it.
    EXPECT_EQ(kdRmdir("/"), -1);
    EXPECT_EQ(kdGetError(), KD_EACCES);
    EXPECT_EQ(kdRename("/.", "/elsewhere"), -1);
    EXPECT_EQ(kdRemove("//"), -1);

    EXPECT_EQ(readHostFile(base / "victim"), "outside");
    EXPECT_EQ(hostEntries(base), (std::set<std::string>{"root", "victim"}));
    EXPECT_EQ(readHostFile(root / "data" / "inside"), "inside");
    EXPECT_EQ(hostEntries(root / "data"), (std::set<std::string>{"a", "inside"}));
}

TEST_F(FilesTest, PlatformPathsMapUnderTheRoot) {
    const std::string expected = root.string() + "/data/x";
    EXPECT_EQ(pal::hostPath("/data/x"), expected);
    EXPECT_EQ(pal::hostPath("data/x"), expected);
    EXPECT_EQ(pal::hostPath("//data/./x"), expected);
    EXPECT_EQ(pal::hostPath("/data/x/"), expected + "/");
    // Dots inside a name do not make it a parent reference.
    EXPECT_EQ(pal::hostPath("/data/..x"), root.string() + "/data/..x");
    EXPECT_EQ(pal::hostPath("/data/x.."), root.string() + "/data/x..");
    writeFile("/..x", "dots");
    EXPECT_EQ(readHostFile(root / "..x"), "dots");

    pal::setFileRoot("");
    EXPECT_EQ(pal::hostPath("/data/x"), "");
    EXPECT_EQ(kdFopen("/data/x", "wb"), nullptr);
    EXPECT_EQ(kdGetError(), KD_EACCES);
}

TEST_F(FilesTest, FailedCallsGiveTheirReason) {
    ASSERT_EQ(kdMkdirAllZVR("/dir/sub"), 0);
    writeFile("/f", "");
    EXPECT_EQ(kdAccess("/f", KD_R_OK | KD_W_OK), 0);
    KDStat st;
    const std::vector<std::tuple<const char*, std::function<bool()>, KDint>> failures = {
        {"fopen missing", [] { return kdFopen("/missing", "rb") == nullptr; }, KD_ENOENT},
        {"fopen in missing folder", [] { return kdFopen("/nodir/new", "wb") == nullptr; }, KD_ENOENT},
        {"fopen folder", [] { return kdFopen("/dir", "rb") == nullptr; }, KD_EACCES},
        {"fopen exclusive", [] { return kdFopen("/f", "wx") == nullptr; }, KD_EEXIST},
        {"stat missing", [&] { return kdStat("/none", &st) == -1; }, KD_ENOENT},
        {"access missing", [] { return kdAccess("/none", 0) == -1; }, KD_ENOENT},
        {"access unknown mode", [] { return kdAccess("/f", 8) == -1; }, KD_EINVAL},
        {"opendir file", [] { return kdOpenDir("/f") == nullptr; }, KD_ENOENT},
        {"opendir missing", [] { return kdOpenDir("/none") == nullptr; }, KD_ENOENT},
        {"remove missing", [] { return kdRemove("/none") == -1; }, KD_ENOENT},
        {"rmdir not empty", [] { return kdRmdir("/dir") == -1; }, KD_EEXIST},
        {"mkdir existing", [] { return kdMkdir("/dir") == -1; }, KD_EEXIST},
        {"mkdirall over file", [] { return kdMkdirAllZVR("/f") == -1; }, KD_EEXIST},
    };
    for (const auto& [call, failed, reason] : failures) {
        SCOPED_TRACE(call);
        kdSetError(0);
        EXPECT_TRUE(failed());
        EXPECT_EQ(kdGetError(), reason);
    }
    for (const char* mode : {"", "q", "rw", "rbb", "r+x", "we"}) {
        SCOPED_TRACE(mode);
        EXPECT_EQ(kdFopen("/new", mode), nullptr);
        EXPECT_EQ(kdGetError(), KD_EINVAL);
    }
    EXPECT_EQ(kdRemove("/dir"), -1);
    EXPECT_EQ(kdMkdirAllZVR("/f/sub"), -1);
    EXPECT_FALSE(fs::exists(root / "new"));
    EXPECT_TRUE(fs::is_directory(root / "dir" / "sub"));
    EXPECT_TRUE(fs::is_regular_file(root / "f"));
}

TEST_F(FilesTest, OpenModesBehaveAsInC) {
    writeFile("/f", "hello");
    KDFile* append = kdFopen("/f", "ab");
    ASSERT_NE(append, nullptr);
    EXPECT_EQ(kdFwrite(" world", 1, 6, append), 6u);
    kdFclose(append);
    EXPECT_EQ(readHostFile(root / "f"), "hello world");

    // Reading then writing without a seek in between, which C leaves undefined.
    KDFile* update = kdFopen("/f", "r+b");
    ASSERT_NE(update, nullptr);
    EXPECT_EQ(kdGetc(update), 'h');
    EXPECT_EQ(kdPutc('E', update), 'E');
    char rest[3] = {};
    EXPECT_EQ(kdFread(rest, 1, 3, update), 3u);
    EXPECT_EQ(std::string(rest, 3), "llo");
    kdFclose(update);
    EXPECT_EQ(readHostFile(root / "f"), "hEllo world");

    KDFile* truncating = kdFopen("/f", "w+");
    ASSERT_NE(truncating, nullptr);
    EXPECT_EQ(kdFwrite("abc", 1, 3, truncating), 3u);
    EXPECT_EQ(kdFseek(truncating, 1, KD_SEEK_SET), 0);
    EXPECT_EQ(kdGetc(truncating), 'b');
    kdFclose(truncating);
    EXPECT_EQ(readHostFile(root / "f"), "abc");
}

TEST_F(FilesTest, OffsetsBeyondFourGiBAreRepresentable) {
    const KDoff far = (KDoff(5) << 30) + 7;
    KDFile* file = kdFopen("/sparse", "w+b");
    ASSERT_NE(file, nullptr);
    ASSERT_EQ(kdFseek(file, far, KD_SEEK_SET), 0);
    EXPECT_EQ(kdFtell(file), far);
    EXPECT_EQ(kdPutc('z', file), 'z');
    KDStat st;
    ASSERT_EQ(kdFstat(file, &st), 0);
    EXPECT_EQ(st.st_size, far + 1);
    ASSERT_EQ(kdFseek(file, -1, KD_SEEK_END), 0);
    EXPECT_EQ(kdFtell(file), far);
    EXPECT_EQ(kdGetc(file), 'z');
    ASSERT_EQ(kdFseek(file, -far, KD_SEEK_CUR), 0);
    EXPECT_EQ(kdFtell(file), 1);
    EXPECT_EQ(kdFseek(file, -5, KD_SEEK_SET), -1);
    EXPECT_EQ(kdGetError(), KD_EINVAL);
    kdFclose(file);
    ASSERT_EQ(kdTruncate("/sparse", 3), 0);
    ASSERT_EQ(kdStat("/sparse", &st), 0);
    EXPECT_EQ(st.st_size, 3);
}

TEST_F(FilesTest, ReadCountsWholeElementsAndSetsTheIndicators) {
    writeFile("/f", "abcdefg");
    KDFile* file = kdFopen("/f", "rb");
    ASSERT_NE(file, nullptr);
    char buffer[8] = {};
    EXPECT_EQ(kdFread(buffer, 3, 4, file), 2u);
    EXPECT_EQ(std::string(buffer), "abcdefg");
    EXPECT_NE(kdFEOF(file), 0);
    EXPECT_EQ(kdGetc(file), KD_EOF);
    EXPECT_EQ(kdFerror(file), 0);
    kdClearerr(file);
    EXPECT_EQ(kdFEOF(file), 0);

    EXPECT_EQ(kdPutc('y', file), KD_EOF);
    EXPECT_NE(kdFerror(file), 0);
    EXPECT_EQ(kdGetError(), KD_EBADF);
    kdClearerr(file);
    EXPECT_EQ(kdFerror(file), 0);
    kdFclose(file);
    EXPECT_EQ(readHostFile(root / "f"), "abcdefg");
}

TEST_F(FilesTest, StatReportsTypeSizeAndTimeAndFstatCountsUnflushedBytes) {
    const KDtime before = std::time(nullptr);
    KDFile* file = kdFopen("/f", "wb");
    ASSERT_NE(file, nullptr);
    ASSERT_EQ(kdFwrite("12345", 1, 5, file), 5u);
    KDStat st;
    ASSERT_EQ(kdFstat(file, &st), 0);
    EXPECT_EQ(st.st_size, 5);
    kdFclose(file);
    const KDtime after = std::time(nullptr);

    ASSERT_EQ(kdStat("/f", &st), 0);
    EXPECT_TRUE(KD_ISREG(st.st_mode));
    EXPECT_FALSE(KD_ISDIR(st.st_mode));
    EXPECT_EQ(st.st_size, 5);
    // File times come from the host's file system clock, which may run a
    // little behind or ahead of the wall clock.
    EXPECT_GE(st.st_mtime, before - 2);
    EXPECT_LE(st.st_mtime, after + 2);
    ASSERT_EQ(kdMkdir("/d"), 0);
    ASSERT_EQ(kdStat("/d", &st), 0);
    EXPECT_TRUE(KD_ISDIR(st.st_mode));
    EXPECT_FALSE(KD_ISREG(st.st_mode));
}

TEST_F(FilesTest, MkdirAllCreatesEveryMissingLevelAlsoFromSeveralThreadsAtOnce) {
    EXPECT_EQ(kdMkdirAllZVR("/data/a/b/c/"), 0);
    EXPECT_TRUE(fs::is_directory(root / "data" / "a" / "b" / "c"));
    EXPECT_EQ(kdMkdirAllZVR("/data/a/b/c"), 0);
    EXPECT_EQ(kdMkdirAllZVR("/"), 0);

    std::vector<std::thread> threads;
    std::vector<int> results(4, -1);
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&results, i] { results[i] = kdMkdirAllZVR("/data/x/y/z/w"); });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(results, std::vector<int>(4, 0));
    EXPECT_TRUE(fs::is_directory(root / "data" / "x" / "y" / "z" / "w"));
}

TEST_F(FilesTest, RenameReplacesRemoveAndRmdirDeleteAndListingSkipsDotEntries) {
    ASSERT_EQ(kdMkdirAllZVR("/data/sub/deeper"), 0);
    writeFile("/data/old", "new content");
    writeFile("/data/target", "old content");
    ASSERT_EQ(kdRename("/data/old", "/data/target"), 0);
    EXPECT_EQ(readHostFile(root / "data" / "target"), "new content");
    EXPECT_EQ(listDir("/data"), (std::vector<std::string>{"sub", "target"}));

    EXPECT_EQ(kdRemove("/data/target"), 0);
    EXPECT_EQ(kdRmdir("/data/sub/deeper"), 0);
    EXPECT_EQ(listDir("/data/sub/"), std::vector<std::string>{});
    EXPECT_EQ(kdRmdir("/data/sub"), 0);
    EXPECT_EQ(hostEntries(root / "data"), std::set<std::string>{});
}

TEST(ErrorsTest, LastErrorBelongsToEachThread) {
    kdSetError(KD_EIO);
    KDint seenByOther = -1;
    std::thread other([&seenByOther] {
        kdSetError(KD_ENOSPC);
        seenByOther = kdGetError();
    });
    other.join();
    EXPECT_EQ(seenByOther, KD_ENOSPC);
    EXPECT_EQ(kdGetError(), KD_EIO);
}

}  // namespace
