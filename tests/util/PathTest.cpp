#include <gtest/gtest.h>

#include "util/Path.h"

TEST(PathTest, SplitsTheLastExtensionOffTheNameAfterTheLastSlash) {
    const char* const cases[][4] = {
        // path, filename, extension, filename without extension
        {"/data/maps.v2/file.tar.gz", "file.tar.gz", "gz", "file.tar"},
        {"/data/maps.v2/readme", "readme", "", "readme"},
        {"plain", "plain", "", "plain"},
        {"/data/dir/", "", "", ""},
        {"/a/name.", "name.", "", "name"},
        {"/home/.profile", ".profile", "profile", ""},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(c[1], Path::getFilename(c[0])) << c[0];
        EXPECT_EQ(c[2], Path::getExtension(c[0])) << c[0];
        EXPECT_EQ(c[3], Path::getFilenameWithoutExtension(c[0])) << c[0];
    }
}
