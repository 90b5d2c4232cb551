#include "common/include/FileLabel.h"

#include <gtest/gtest.h>

#include <string_view>

TEST(FileLabel, IsThePathFromTheRootWithoutExtension) {
    EXPECT_STREQ("system/include/System", ZT_FILE_LABEL_OF("system/include/System.h"));
    EXPECT_STREQ("os/common/include/Mutex", ZT_FILE_LABEL_OF("os/common/include/Mutex.h"));
    EXPECT_STREQ("tavik/include/TavikTarget", ZT_FILE_LABEL_OF("tavik/include/TavikTarget.h"));
    EXPECT_STREQ("tests/unit/common/FileLabelTest", ZT_FILE_LABEL);
}

TEST(FileLabel, OfTheAgentsSourcesIsTheNameAlone) {
    EXPECT_STREQ(".//TavikSystem", ZT_FILE_LABEL_OF("tavik/src/TavikSystem.cpp"));
    EXPECT_STREQ(".//A", ZT_FILE_LABEL_OF("tavik/src/A.cpp"));
    EXPECT_STREQ(".//", ZT_FILE_LABEL_OF("tavik/src/"));
}

TEST(FileLabel, LeavesOutWhatLeadsUpToTheRoot) {
    EXPECT_STREQ(".//TavikSystem", ZT_FILE_LABEL_OF("../../tavik/src/TavikSystem.cpp"));
    EXPECT_STREQ("os/common/include/Mutex", ZT_FILE_LABEL_OF("../os/common/include/Mutex.h"));
    EXPECT_STREQ("..a/b", ZT_FILE_LABEL_OF("..a/b.h"));
    EXPECT_STREQ("", ZT_FILE_LABEL_OF("../"));
}

TEST(FileLabel, OnlyTheLastExtensionOfTheNameGoes) {
    EXPECT_STREQ("a.b/c", ZT_FILE_LABEL_OF("a.b/c"));
    EXPECT_STREQ("a.b/c", ZT_FILE_LABEL_OF("a.b/c.d"));
    EXPECT_STREQ("a/b.c", ZT_FILE_LABEL_OF("a/b.c.d"));
    EXPECT_STREQ("a/.hidden", ZT_FILE_LABEL_OF("a/.hidden"));
    EXPECT_STREQ("name", ZT_FILE_LABEL_OF("name"));
    EXPECT_STREQ("name", ZT_FILE_LABEL_OF("name.cpp"));
    EXPECT_STREQ("", ZT_FILE_LABEL_OF(""));
}

TEST(FileLabel, IsMadeAtCompileTime) {
    constexpr const char* lcpLabel = ZT_FILE_LABEL_OF("tavik/src/TavikCore.cpp");
    static_assert(std::string_view(".//TavikCore") == lcpLabel);
    EXPECT_EQ(lcpLabel, ZT_FILE_LABEL_OF("tavik/src/TavikCore.cpp")) << "one copy in the program";
}
