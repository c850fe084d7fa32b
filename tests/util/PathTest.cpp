#include <gtest/gtest.h>

#include "util/Path.h"

TEST(PathTest, FilenameIsTheTextAfterTheLastSlash) {
    EXPECT_EQ("file.tar.gz", Path::getFilename("/data/maps.v2/file.tar.gz"));
    EXPECT_EQ("plain", Path::getFilename("plain"));
    EXPECT_EQ("", Path::getFilename("/data/dir/"));
}

TEST(PathTest, DotsInFolderNamesAreNotExtensions) {
    EXPECT_EQ("", Path::getExtension("/data/maps.v2/readme"));
    EXPECT_EQ("readme", Path::getFilenameWithoutExtension("/data/maps.v2/readme"));
}

TEST(PathTest, OnlyTheLastExtensionIsSplitOff) {
    EXPECT_EQ("gz", Path::getExtension("/a/file.tar.gz"));
    EXPECT_EQ("file.tar", Path::getFilenameWithoutExtension("/a/file.tar.gz"));
}

TEST(PathTest, NamesEndingOrStartingWithADot) {
    EXPECT_EQ("", Path::getExtension("/a/name."));
    EXPECT_EQ("name", Path::getFilenameWithoutExtension("/a/name."));
    EXPECT_EQ("profile", Path::getExtension("/home/.profile"));
    EXPECT_EQ("", Path::getFilenameWithoutExtension("/home/.profile"));
}
