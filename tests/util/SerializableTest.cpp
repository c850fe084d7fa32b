#include <filesystem>
#include <fstream>
#include <iterator>

#include "support/PalTest.h"
#include "util/TestSettings.h"

const char* const TestSettings::kName = "settings.bin";

namespace {

namespace fs = std::filesystem;

class SerializableTest : public PalTest {
protected:
    std::string dataFile() const { return hostPath("/data/settings.bin"); }
    std::string tempFile() const { return hostPath("/data/settings.bin.tmp"); }

    std::vector<unsigned char> fileBytes(const std::string& path) const {
        std::ifstream in(path, std::ios::binary);
        return std::vector<unsigned char>(std::istreambuf_iterator<char>(in),
                                          std::istreambuf_iterator<char>());
    }

    static TestSettings filled(bool compressed = false, int version = 3) {
        TestSettings settings(compressed, version);
        settings.zoom = 7;
        settings.title = "saved";
        settings.points = {1.5f, -2.25f};
        return settings;
    }

    static void expectDefaults(const TestSettings& settings) {
        EXPECT_EQ(1, settings.zoom);
        EXPECT_EQ("default", settings.title);
        EXPECT_TRUE(settings.points.empty());
    }
};

}  // namespace

TEST_F(SerializableTest, SavedSettingsLoadBackFromAPlainOrGzippedFile) {
    // The plain file opens with the magic and the little-endian version.
    const std::vector<unsigned char> plainHead = {'M', 'C', 'S', 'T', 3, 0, 0, 0};
    const std::vector<unsigned char> gzipHead = {0x1f, 0x8b};
    for (bool compressed : {false, true}) {
        filled(compressed).save();
        const std::vector<unsigned char>& head = compressed ? gzipHead : plainHead;
        const std::vector<unsigned char> bytes = fileBytes(dataFile());
        ASSERT_GE(bytes.size(), head.size());
        EXPECT_EQ(head, std::vector<unsigned char>(bytes.begin(), bytes.begin() + head.size()));
        TestSettings loaded(compressed);
        ASSERT_TRUE(loaded.load());
        EXPECT_EQ(7, loaded.zoom);
        EXPECT_EQ("saved", loaded.title);
        EXPECT_EQ((std::vector<float>{1.5f, -2.25f}), loaded.points);
        EXPECT_EQ(3, loaded.getReadFormatVersion());
        EXPECT_FALSE(fs::exists(tempFile()));
        EXPECT_TRUE(hasLogLine("Renaming /data/settings.bin.tmp to /data/settings.bin"));
    }
}

TEST_F(SerializableTest, OnlyTheCurrentVersionLoadsUnlessOlderOnesAreSupported) {
    filled(false, 4).save();
    TestSettings newer;
    EXPECT_FALSE(newer.load());
    EXPECT_EQ(4, newer.getReadFormatVersion());
    expectDefaults(newer);
    EXPECT_TRUE(hasLogLine("Invalid settings.bin"));

    filled(false, 2).save();
    TestSettings strict;
    EXPECT_FALSE(strict.load());
    expectDefaults(strict);
    TestSettings lenient;
    lenient.enableSupportPreviousFormatVersions(true);
    ASSERT_TRUE(lenient.load());
    EXPECT_EQ(2, lenient.getReadFormatVersion());
    EXPECT_EQ("saved", lenient.title);
    EXPECT_TRUE(lenient.points.empty());
}

TEST_F(SerializableTest, AMissingOrForeignFileLeavesTheDefaults) {
    TestSettings loaded;
    loaded.zoom = 99;
    EXPECT_FALSE(loaded.load());
    expectDefaults(loaded);
    EXPECT_TRUE(hasLogLine("No settings.bin found"));

    filled().save();
    std::vector<unsigned char> bytes = fileBytes(dataFile());
    bytes[0] = 'X';
    std::ofstream(dataFile(), std::ios::binary)
        .write(reinterpret_cast<const char*>(bytes.data()), bytes.size());
    loaded.zoom = 99;
    loaded.title = "stale";
    EXPECT_FALSE(loaded.load());
    expectDefaults(loaded);
}

TEST_F(SerializableTest, FallsBackToTheTmpFolder) {
    filled().save();
    fs::create_directories(hostPath("/tmp"));
    fs::rename(dataFile(), hostPath("/tmp/settings.bin"));
    TestSettings loaded;
    ASSERT_TRUE(loaded.load());
    EXPECT_EQ(7, loaded.zoom);
}

TEST_F(SerializableTest, TruncatedFileFailsWithTheObjectReset) {
    filled().save();
    // Header (8), zoom (4) and title (4 + 5) survive and the point count is cut in half, so
    // the read throws after it has already filled in zoom and title.
    fs::resize_file(dataFile(), 8 + 4 + 9 + 2);
    TestSettings loaded;
    EXPECT_FALSE(loaded.load());
    EXPECT_TRUE(hasLogLine("Bad state"));
    expectDefaults(loaded);

    filled(true).save();
    fs::resize_file(dataFile(), fs::file_size(dataFile()) - 10);
    TestSettings compressed(true);
    EXPECT_FALSE(compressed.load());
    expectDefaults(compressed);
}

TEST_F(SerializableTest, UnopenableTemporaryFileKeepsTheOldFile) {
    filled().save();
    const std::vector<unsigned char> before = fileBytes(dataFile());
    fs::create_directory(tempFile());

    TestSettings changed = filled();
    changed.title = "changed";
    changed.save();

    EXPECT_TRUE(hasLogLine("Failed to write to /data/settings.bin.tmp"));
    EXPECT_EQ(before, fileBytes(dataFile()));
    TestSettings loaded;
    ASSERT_TRUE(loaded.load());
    EXPECT_EQ("saved", loaded.title);
}

TEST_F(SerializableTest, FullDiskKeepsTheOldFileAndRemovesTheTemporary) {
    for (bool compressed : {false, true}) {
        filled(compressed).save();
        const std::vector<unsigned char> before = fileBytes(dataFile());
        // Every write to /dev/full fails with "no space left", also for root. The small file
        // fails when it is closed, the large one while it is written.
        for (size_t titleSize : {size_t(5), size_t(200000)}) {
            clearLog();
            fs::create_symlink("/dev/full", tempFile());
            TestSettings changed = filled(compressed);
            changed.title = std::string(titleSize, 'x');
            changed.save();

            EXPECT_TRUE(hasLogLine("Failed to write to /data/settings.bin.tmp")) << titleSize;
            EXPECT_FALSE(hasLogLine("Renaming /data/settings.bin.tmp to /data/settings.bin"));
            ASSERT_FALSE(fs::is_symlink(dataFile())) << "the full disk took the settings' place";
            EXPECT_EQ(before, fileBytes(dataFile()));
            EXPECT_FALSE(fs::exists(fs::symlink_status(tempFile())));
        }
    }
}

TEST_F(SerializableTest, FailedRenameRemovesTheTemporary) {
    fs::create_directories(dataFile() + "/occupied");
    filled().save();
    EXPECT_TRUE(hasLogLine("Failed to write to /data/settings.bin"));
    EXPECT_FALSE(fs::exists(tempFile()));
    EXPECT_TRUE(fs::is_directory(dataFile()));
}
