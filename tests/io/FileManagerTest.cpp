#include <pal/Simulation.h>

#include <algorithm>
#include <boost/make_shared.hpp>
#include <filesystem>
#include <fstream>
#include <iterator>

#include "IoTest.h"
#include "io/FileManager.h"
#include "io/FileOutputStream.h"
#include "io/resource/PackageBuilder.h"

namespace {

using IO::FileManager;

class FileManagerTest : public IoTest {
protected:
    void SetUp() override {
        IoTest::SetUp();
        pal::setDeviceString(KD_STRING_PACKAGE_NAME_ZVR, "app");
    }

    void TearDown() override {
        while (initialised > 0) {
            shutdown();
        }
        IoTest::TearDown();
    }

    void init() {
        FileManager::initResourceFileSystem();
        ++initialised;
    }

    void shutdown() {
        FileManager::shutdownResourceFileSystem();
        --initialised;
    }

    void writePackage(const std::string& path) {
        boost::shared_ptr<IO::FileOutputStream> out = boost::make_shared<IO::FileOutputStream>();
        ASSERT_TRUE(out->init(path.c_str()));
        IO::Resource::PackageBuilder builder(out, 400);
        builder.addResource("a.png", png.data(), png.size(), false);
        builder.addResource("big.bin", big.data(), big.size(), true);
    }

    static Bytes readResource(const char* name) {
        boost::shared_ptr<IO::InputStream> stream = FileManager::openInputRes(name);
        return stream ? readAll(*stream) : Bytes();
    }

    int initialised = 0;
    Bytes png = pattern(300, 1);
    Bytes big = pattern(1000, 2);
};

}  // namespace

TEST_F(FileManagerTest, PlainFilesOpenForWritingAndReadingButNotResourcePaths) {
    boost::shared_ptr<IO::OutputStream> out = FileManager::openOutput("/data/settings/s.bin");
    ASSERT_TRUE(out);
    out->writeString("saved");
    out.reset();
    boost::shared_ptr<IO::InputStream> in = FileManager::openInput("/data/settings/s.bin");
    std::string text;
    EXPECT_TRUE(in && in->readString(text));
    EXPECT_EQ("saved", text);
    EXPECT_FALSE(FileManager::openInput("/data/none"));
    EXPECT_TRUE(logLines().empty());

    EXPECT_TRUE(FileManager::isResourceFile("/resx"));
    EXPECT_FALSE(FileManager::isResourceFile("/re"));
    expectAssertion("kdStrlen(aFileName) >= 4");
    FileManager::openInput("/res/a.png");
    expectAssertion("!isResourceFile(aFileName)");
    FileManager::openOutput("/res/a.png");
    expectAssertion("!isResourceFile(aFileName)");
}

TEST_F(FileManagerTest, ResourcesComeFromThePackageNamedByThePlatformUnlessDataOverridesThem) {
    writePackage("/res/app.pak");
    writeFile("/data/a.png", bytesOf("override"));
    init();
    EXPECT_EQ(bytesOf("override"), readResource("a.png"));
    EXPECT_EQ(big, readResource("big.bin"));
    EXPECT_FALSE(FileManager::openInputRes("missing.png"));
    EXPECT_TRUE(hasLogLine("File missing.png not found in resource"));
    kdRemove("/data/a.png");
    EXPECT_EQ(png, readResource("a.png"));
}

TEST_F(FileManagerTest, NestedInitialisationsKeepThePackageOpenUntilTheLastShutdown) {
    writePackage("/res/app.pak");
    init();
    init();
    shutdown();
    EXPECT_EQ(png, readResource("a.png"));
    boost::shared_ptr<IO::InputStream> kept = FileManager::openInputRes("big.bin");
    shutdown();
    EXPECT_FALSE(FileManager::openInputRes("a.png"));
    ASSERT_TRUE(kept);
    EXPECT_EQ(big, readAll(*kept));
}

TEST_F(FileManagerTest, NothingOpensBeforeInitialisationAndOnlyOverridesWithoutAPackage) {
    writeFile("/data/a.png", bytesOf("override"));
    EXPECT_FALSE(FileManager::openInputRes("a.png"));
    EXPECT_EQ(1, countLogLines("not initialised"));
    init();
    EXPECT_EQ(1, countLogLines("/res/app.pak"));
    EXPECT_EQ(bytesOf("override"), readResource("a.png"));
    EXPECT_FALSE(FileManager::openInputRes("big.bin"));
}

TEST_F(FileManagerTest, ANameTooLongToOverrideIsNotCutIntoAnotherFile) {
    std::string name(260, 'n');
    writeFile("/data/" + std::string(249, 'n'), bytesOf("wrong file"));
    writePackage("/res/app.pak");
    init();
    EXPECT_FALSE(FileManager::openInputRes(name.c_str()));
}

TEST_F(FileManagerTest, ResourcesOpenAndReadOnSeveralThreadsAtOnce) {
    writePackage("/res/app.pak");
    init();
    int matches[2] = {0, 0};
    KDThread* threads[2];
    for (int i = 0; i < 2; ++i) {
        threads[i] = kdThreadCreate(
            nullptr,
            [](void* count) -> void* {
                for (int round = 0; round < 20; ++round) {
                    boost::shared_ptr<IO::InputStream> stream = FileManager::openInputRes("big.bin");
                    *static_cast<int*>(count) += stream && readAll(*stream) == pattern(1000, 2) ? 1 : 0;
                }
                return nullptr;
            },
            &matches[i]);
        ASSERT_TRUE(threads[i]);
    }
    for (KDThread* thread : threads) {
        kdThreadJoin(thread, nullptr);
    }
    EXPECT_EQ(20, matches[0]);
    EXPECT_EQ(20, matches[1]);
}

TEST_F(FileManagerTest, ScanDirectoryListsLinkedFilesButNeverFollowsALinkedFolder) {
    writeFile("/data/scan/a.png", Bytes());
    writeFile("/data/other/b.png", Bytes());
    std::filesystem::create_directory_symlink("..", hostPath("/data/scan") + "/up");
    std::filesystem::create_directory_symlink(hostPath("/data/other"), hostPath("/data/scan") + "/other");
    std::filesystem::create_symlink(hostPath("/data/other/b.png"), hostPath("/data/scan") + "/linked.png");
    std::filesystem::create_symlink("missing.png", hostPath("/data/scan") + "/dangling.png");
    std::vector<std::string> out;
    FileManager::scanDirectory("/data/scan", out, ".png", true);
    std::sort(out.begin(), out.end());
    EXPECT_EQ((std::vector<std::string>{"/data/scan/a.png", "/data/scan/linked.png"}), out);
}

TEST_F(FileManagerTest, ScanDirectoryAppendsMatchingFilesDepthFirstAndLeavesTheOutputAloneForAMissingFolder) {
    writeFile("/data/scan/a.png", Bytes());
    writeFile("/data/scan/b.txt", Bytes());
    writeFile("/data/scan/sub/c.png", Bytes());
    writeFile("/data/scan/sub/deep/d.PNG", Bytes());
    std::vector<std::string> out = {"kept"};
    FileManager::scanDirectory("/data/scan", out, ".png", true);
    std::sort(out.begin() + 1, out.end());
    EXPECT_EQ((std::vector<std::string>{"kept", "/data/scan/a.png", "/data/scan/sub/c.png"}), out);

    std::vector<std::string> flat;
    FileManager::scanDirectory("/data/scan", flat, nullptr, false);
    std::sort(flat.begin(), flat.end());
    EXPECT_EQ((std::vector<std::string>{"/data/scan/a.png", "/data/scan/b.txt"}), flat);

    std::vector<std::string> longSuffix;
    FileManager::scanDirectory("/data/scan", longSuffix, "a-suffix-longer-than-any-path-in-here.png", true);
    EXPECT_TRUE(longSuffix.empty());

    const std::vector<std::string> before = out;
    FileManager::scanDirectory("/data/none", out, nullptr, true);
    EXPECT_EQ(before, out);
    EXPECT_TRUE(hasLogLine("FileManager::scanDirectory()[could not open dir]"));
}

TEST_F(FileManagerTest, APackageWhoseDirectoryClaimsMoreThanTheFileHoldsIsNoPackageAndSaysSoOnce) {
    writePackage("/res/app.pak");
    Bytes bytes;
    {
        std::ifstream in(hostPath("/res/app.pak"), std::ios::binary);
        bytes.assign(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
    }
    // The first directory record claims a name, extra field and comment of about 64 KiB each.
    const Bytes central = {0x50, 0x4b, 0x01, 0x02};
    auto record = std::search(bytes.begin(), bytes.end(), central.begin(), central.end());
    ASSERT_NE(bytes.end(), record);
    std::fill(record + 28, record + 34, 0xff);
    writeFile("/res/app.pak", bytes);

    init();
    expectAssertion("false");
    EXPECT_EQ(1u, logLines().size());
    EXPECT_EQ(1, countLogLines("is damaged or runs past the archive"));
    EXPECT_FALSE(FileManager::openInputRes("a.png"));
    EXPECT_TRUE(hasLogLine("File a.png not found in resource"));
}
