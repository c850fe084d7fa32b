#include <pal/Simulation.h>

#include <boost/make_shared.hpp>
#include <cstdlib>

#include "IoTest.h"
#include "io/FileManager.h"
#include "io/zip/ZipFile.h"

namespace {

class PackageToolTest : public IoTest {
protected:
    int runTool(const std::string& arguments) {
        std::string command = std::string(MAPCORE_PAK_TOOL) + " " + arguments + " >/dev/null 2>&1";
        return std::system(command.c_str());
    }
};

}  // namespace

TEST_F(PackageToolTest, PacksAFolderThatTheFileManagerReadsBack) {
    Bytes big = pattern(2500, 5);
    Bytes icon = pattern(100, 6);
    writeFile("/in/maps/big.bin", big);
    writeFile("/in/icon.png", icon);
    std::string in = hostPath("/in");
    std::string out = hostPath("/res/mapcore.pak");
    ASSERT_EQ(0, runTool("--block-size 1000 --store-suffix .png " + in + " " + out));

    IO::FileManager::initResourceFileSystem();
    boost::shared_ptr<IO::InputStream> stream = IO::FileManager::openInputRes("maps/big.bin");
    ASSERT_TRUE(stream);
    EXPECT_EQ(big, readAll(*stream));
    stream = IO::FileManager::openInputRes("icon.png");
    ASSERT_TRUE(stream);
    EXPECT_EQ(icon, readAll(*stream));
    IO::FileManager::shutdownResourceFileSystem();

    boost::shared_ptr<IO::Zip::ZipFile> zip = boost::make_shared<IO::Zip::ZipFile>();
    ASSERT_TRUE(zip->init(IO::FileManager::doOpenInput("/res/mapcore.pak"), nullptr));
    EXPECT_FALSE(zip->findEntry("icon.png")->compressed);
    EXPECT_TRUE(zip->findEntry("maps/big.bin.part002")->compressed);
}

TEST_F(PackageToolTest, RefusesBadArgumentsAndEmptyOrMissingFolders) {
    writeFile("/empty/.keep", Bytes());
    kdRemove("/empty/.keep");
    std::string out = hostPath("/out.pak");
    EXPECT_NE(0, runTool(hostPath("/missing") + " " + out));
    EXPECT_NE(0, runTool(hostPath("/empty") + " " + out));
    EXPECT_NE(0, runTool("--block-size x " + hostPath("/empty") + " " + out));
    EXPECT_NE(0, runTool(hostPath("/empty")));
    KDStat info;
    EXPECT_NE(0, kdStat("/out.pak", &info));
}
