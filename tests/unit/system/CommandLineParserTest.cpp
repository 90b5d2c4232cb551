#include "system/include/CommandLineParser.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "common/include/Exception.h"

static ZTCVector<ZTSCommandLineArgumentDesc> sDescs() {
    const struct {
        const char* mpIdentifier;
        ZTECommandLineArgumentType mType;
    } lcRows[] = {{"-h", ZTCLAT_OptionOnly},  {"-v", ZTCLAT_OptionOnly},  {"-s", ZTCLAT_OptionOnly},
                  {"-D", ZTCLAT_OptionValue}, {"-l", ZTCLAT_OptionValue}, {"-d", ZTCLAT_OptionValue},
                  {"-c", ZTCLAT_OptionValue}, {"-S", ZTCLAT_OptionOnly},  {"-b", ZTCLAT_OptionValue}};
    ZTCVector<ZTSCommandLineArgumentDesc> lDescs(MAX_CMD_ARGUMENTS);
    for (const auto& lcrRow : lcRows) {
        ZTSCommandLineArgumentDesc lDesc{};
        lDesc.type = lcrRow.mType;
        std::strcpy(lDesc.identifier, lcrRow.mpIdentifier);
        lDescs.add(lDesc);
    }
    return lDescs;
}

static ZTSCommandLineOptions sParse(const std::vector<const char*>& acrArguments) {
    std::vector<const char*> lArgv = {"program"};
    lArgv.insert(lArgv.end(), acrArguments.begin(), acrArguments.end());
    ZTCCommandLineParser lParser;
    lParser.parse(sDescs(), static_cast<int>(lArgv.size()), lArgv.data());
    EXPECT_EQ(lParser.getState(), ZTPS_Done);
    return lParser.getOptions();
}

static std::string sError(const std::vector<const char*>& acrArguments) {
    try {
        sParse(acrArguments);
    } catch (const ZTCInvalidEx& acrException) {
        return acrException.what();
    }
    return "";
}

TEST(CommandLineParser, WithoutArgumentsEverythingIsAtItsDefault) {
    const ZTSCommandLineOptions lOptions = sParse({});
    EXPECT_FALSE(lOptions.mShowHelp || lOptions.mShowVersion || lOptions.mShutDownOther || lOptions.mSniffer);
    EXPECT_FALSE(lOptions.mHasLogFile || lOptions.mHasLogCode || lOptions.mHasConfigFile || lOptions.mHasHbTimeout);
    EXPECT_TRUE(lOptions.mRunAsDaemon);
    ZTCCommandLineParser lParser;
    EXPECT_EQ(lParser.getState(), ZTPS_NotStarted);
    lParser.parse(sDescs(), 0, nullptr);
    EXPECT_EQ(lParser.getState(), ZTPS_Done);
}

TEST(CommandLineParser, OptionsWithoutAValueAreFlagsAndCaseMatters) {
    const ZTSCommandLineOptions lSmall = sParse({"-s"});
    EXPECT_TRUE(lSmall.mShutDownOther);
    EXPECT_FALSE(lSmall.mSniffer);
    const ZTSCommandLineOptions lLarge = sParse({"-S", "-h", "-v"});
    EXPECT_FALSE(lLarge.mShutDownOther);
    EXPECT_TRUE(lLarge.mSniffer && lLarge.mShowHelp && lLarge.mShowVersion);
}

TEST(CommandLineParser, ValuesAreTaken) {
    const ZTSCommandLineOptions lOptions =
        sParse({"-D", "false", "-l", "a log", "-d", "0xFf", "-c", "", "-b", "4294967295"});
    EXPECT_FALSE(lOptions.mRunAsDaemon);
    EXPECT_TRUE(lOptions.mHasLogFile && lOptions.mHasLogCode && lOptions.mHasConfigFile && lOptions.mHasHbTimeout);
    EXPECT_STREQ(lOptions.mLogFile.get(), "a log");
    EXPECT_EQ(lOptions.mLogCode, 255u);
    EXPECT_STREQ(lOptions.mConfigFile.get(), "");
    EXPECT_EQ(lOptions.mHbTimeout, 4294967295u);
}

TEST(CommandLineParser, GoodValuesAreAcceptedToTheirLimits) {
    for (const auto& [lpText, lNumber] : {std::pair{"0", 0u}, {"255", 255u}, {"0x0", 0u}, {"0x3f", 63u}, {"007", 7u}}) {
        EXPECT_EQ(sParse({"-d", lpText}).mLogCode, lNumber) << lpText;
    }
    EXPECT_EQ(sParse({"-b", "1"}).mHbTimeout, 1u);
    EXPECT_TRUE(sParse({"-D", "true"}).mRunAsDaemon);
}

TEST(CommandLineParser, OfAnOptionGivenTwiceTheLastCountsAndAllAreChecked) {
    EXPECT_EQ(sParse({"-d", "1", "-d", "2"}).mLogCode, 2u);
    EXPECT_TRUE(sParse({"-D", "false", "-D", "true"}).mRunAsDaemon);
    EXPECT_NE(sError({"-d", "256", "-d", "2"}), "");
}

TEST(CommandLineParser, EveryBadValueIsNamedWithItsOptionAndItsLimits) {
    const struct {
        const char* mpOption;
        const char* mpValue;
        const char* mpLimits;
    } lcRows[] = {
        {"-D", "TRUE", "true or false"},
        {"-D", "", "true or false"},
        {"-D", "1", "true or false"},
        {"-D", "true ", "true or false"},
        {"-d", "", "0 to 255"},
        {"-d", "256", "0 to 255"},
        {"-d", "-1", "0 to 255"},
        {"-d", "+1", "0 to 255"},
        {"-d", "0x", "0 to 255"},
        {"-d", "0x100", "0 to 255"},
        {"-d", "ff", "0 to 255"},
        {"-d", "1 ", "0 to 255"},
        {"-d", " 1", "0 to 255"},
        {"-d", "1.0", "0 to 255"},
        {"-d", "18446744073709551617", "0 to 255"},
        {"-b", "0", "1 to 4294967295"},
        {"-b", "", "1 to 4294967295"},
        {"-b", "0x10", "1 to 4294967295"},
        {"-b", "4294967296", "1 to 4294967295"},
        {"-b", "99999999999999999999999", "1 to 4294967295"},
        {"-l", "", "log file"},
    };
    for (const auto& lcrRow : lcRows) {
        const std::string lError = sError({lcrRow.mpOption, lcrRow.mpValue});
        EXPECT_NE(lError.find(lcrRow.mpOption), std::string::npos) << lError;
        EXPECT_NE(lError.find("'" + std::string(lcrRow.mpValue) + "'"), std::string::npos) << lError;
        EXPECT_NE(lError.find(lcrRow.mpLimits), std::string::npos) << lError;
    }
}

TEST(CommandLineParser, AValueThatIsMissingIsNamedWithItsLimits) {
    for (const char* lpOption : {"-D", "-l", "-d", "-c", "-b"}) {
        for (const std::vector<const char*>& lcrLine :
             {std::vector<const char*>{lpOption}, std::vector<const char*>{lpOption, "-S"}}) {
            const std::string lError = sError(lcrLine);
            EXPECT_NE(lError.find(lpOption), std::string::npos) << lError;
            EXPECT_NE(lError.find("missing"), std::string::npos) << lError;
        }
    }
}

TEST(CommandLineParser, AnUnknownOptionIsNamed) {
    for (const char* lpArgument : {"-x", "--help", "-H", "-d5", "", "-", "file", "-hv"}) {
        const std::string lError = sError({lpArgument});
        EXPECT_NE(lError.find("'" + std::string(lpArgument) + "'"), std::string::npos) << lError;
    }
}

TEST(CommandLineParser, AnErrorWinsOverEveryOption) {
    EXPECT_NE(sError({"-h", "-v", "-s", "-d", "256"}), "");
    EXPECT_NE(sError({"-d", "256", "-h"}), "");
}

TEST(CommandLineParser, AnErrorIsOneLineOfBoundedLength) {
    const std::string lcLong(5000, 'x');
    const std::string lError = sError({"-d", ("a\nb\t\x7f" + lcLong).c_str()});
    EXPECT_NE(lError.find("a?b??xxx"), std::string::npos) << lError;
    EXPECT_LT(lError.size(), 400u);
    EXPECT_NE(lError.find("0 to 255"), std::string::npos) << "the limits are still there";
}

TEST(CommandLineParser, AfterAnErrorNothingIsTakenOver) {
    const char* lpArgv[] = {"program", "-S", "-b", "5", "-d", "x"};
    ZTCCommandLineParser lParser;
    EXPECT_THROW(lParser.parse(sDescs(), 6, lpArgv), ZTCInvalidEx);
    EXPECT_EQ(lParser.getState(), ZTPS_Running);
    EXPECT_FALSE(lParser.getOptions().mSniffer);
    EXPECT_FALSE(lParser.getOptions().mHasHbTimeout);
}

TEST(CommandLineParser, OnlyWhatTheTableHoldsIsAnOption) {
    const ZTCVector<ZTSCommandLineArgumentDesc> lcNone;
    const char* lpArgv[] = {"program", "-h"};
    ZTCCommandLineParser lParser;
    EXPECT_THROW(lParser.parse(lcNone, 2, lpArgv), ZTCInvalidEx);
}
