#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdlib>

#include "sensor/settings/include/Settings.h"
#include "tests/support/TemporaryDirectory.h"

using testing::ElementsAre;

class SettingsFile : public testing::Test {
protected:
    SettingsFile() { unsetenv(gcSettingsFileVariable); }
    ~SettingsFile() override { unsetenv(gcSettingsFileVariable); }

    std::vector<std::string> errors(const std::string& acrPath) {
        std::vector<std::string> lTexts;
        for (const ZTSSettingsProblem& lcrError : readSettings(acrPath).mErrors) {
            lTexts.push_back(lcrError.toText());
        }
        return lTexts;
    }

    const ZTCTemporaryDirectory mDirectory;
    const std::string mPath = mDirectory.path("tavik.toml");
};

TEST_F(SettingsFile, TheOptionWinsOverTheVariable) {
    writeFile(mPath, "agent.log_level = 7\n");
    writeFile(mDirectory.path("other.toml"), "agent.log_level = 8\n");
    setenv(gcSettingsFileVariable, mDirectory.path("other.toml").c_str(), 1);
    EXPECT_EQ(readSettings(mPath).mSettings.mAgentLogLevel, 7U);
    const ZTSSettingsReading lReading = readSettings("");
    EXPECT_EQ(lReading.mSettings.mAgentLogLevel, 8U);
    EXPECT_EQ(lReading.mFile, mDirectory.path("other.toml"));
    EXPECT_EQ(lReading.mContent, "agent.log_level = 8\n");
}

TEST_F(SettingsFile, OneThatWasNamedMustBeThere) {
    const std::string lProblem = mPath + ":0: file: cannot be opened: No such file or directory, must be readable";
    EXPECT_THAT(errors(mPath), ElementsAre(lProblem));
    setenv(gcSettingsFileVariable, mPath.c_str(), 1);
    EXPECT_THAT(errors(""), ElementsAre(lProblem));
}

TEST_F(SettingsFile, WithoutANameTheDefaultFileIsReadWhichMayBeMissing) {
    const ZTSSettingsReading lReading = readSettings("");
    EXPECT_EQ(lReading.mFile, "/etc/tavik/tavik.toml");
    if (!exists(lReading.mFile)) {
        EXPECT_TRUE(lReading.isGood());
        EXPECT_EQ(lReading.mSettings, defaultSettings());
    }
}

TEST_F(SettingsFile, OnlyARegularFileIsReadAndAFifoKeepsNobodyWaiting) {
    EXPECT_THAT(errors(mDirectory.path()),
                ElementsAre(mDirectory.path() + ":0: file: is not a file: something else, must be a regular file"));
    ASSERT_EQ(mkfifo(mPath.c_str(), 0600), 0);
    EXPECT_THAT(errors(mPath), ElementsAre(testing::HasSubstr("must be a regular file")));
}

TEST_F(SettingsFile, AFileLongerThanAMebibyteIsRefused) {
    writeFile(mPath, std::string(1048576, '\n'));
    EXPECT_THAT(errors(mPath), ElementsAre());
    writeFile(mPath, std::string(1048577, '\n'));
    EXPECT_THAT(
        errors(mPath),
        ElementsAre(mPath + ":0: file: is too long: more than 1048576 bytes, must be of at most 1048576 bytes"));
}
