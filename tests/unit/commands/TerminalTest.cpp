#include <fcntl.h>
#include <gmock/gmock.h>
#include <poll.h>
#include <pty.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <sstream>

#include "sensor/client/include/FileDescriptor.h"
#include "sensor/views/include/TextTable.h"
#include "tests/unit/commands/FakeSensor.h"
#include "tests/unit/commands/TavikProgram.h"

using testing::HasSubstr;
using testing::Not;

/// The program on a terminal of its own.
class ZTCTerminalRun {
public:
    ZTCTerminalRun(const ZTSChildProcessSetup& acrSetup, unsigned short aColumns, unsigned short aRows) {
        const winsize lSize{.ws_row = aRows, .ws_col = aColumns, .ws_xpixel = 0, .ws_ypixel = 0};
        std::vector<std::string> lVariables;
        for (const auto& [lName, lValue] : acrSetup.mEnvironment) {
            lVariables.push_back(lName + "=" + lValue);
        }
        std::vector<char*> lEnvironment = sPointers(lVariables);
        std::vector<std::string> lWords{acrSetup.mProgram};
        lWords.insert(lWords.end(), acrSetup.mArguments.begin(), acrSetup.mArguments.end());
        std::vector<char*> lArguments = sPointers(lWords);
        int lMaster = -1;
        mPid = forkpty(&lMaster, nullptr, nullptr, &lSize);
        if (mPid == 0) {
            execve(acrSetup.mProgram.c_str(), lArguments.data(), lEnvironment.data());
            _exit(127);
        }
        mMaster = ZTCFileDescriptor(lMaster);
    }
    ~ZTCTerminalRun() {
        if (!mIsReaped) {
            kill(mPid, SIGKILL);
            waitpid(mPid, nullptr, 0);
        }
    }
    ZTCTerminalRun(const ZTCTerminalRun&) = delete;
    ZTCTerminalRun& operator=(const ZTCTerminalRun&) = delete;

    /// What has come up to the text, or up to the program's end.
    std::string readUntil(const std::string& acrText) {
        const ZTCDeadline lDeadline;
        char lBytes[4096];
        while (mOutput.find(acrText) == std::string::npos) {
            pollfd lSource{.fd = mMaster.get(), .events = POLLIN, .revents = 0};
            poll(&lSource, 1, lDeadline.remainingMilliseconds());
            const ssize_t lCount = lSource.revents == 0 ? 0 : read(mMaster.get(), lBytes, sizeof(lBytes));
            if (lCount <= 0) {
                break;
            }
            mOutput.append(lBytes, static_cast<std::size_t>(lCount));
        }
        return mOutput;
    }
    std::string readAll() { return readUntil("a text that never comes"); }
    void type(char aKey) { ASSERT_EQ(write(mMaster.get(), &aKey, 1), 1); }
    void resize(unsigned short aColumns, unsigned short aRows) {
        const winsize lSize{.ws_row = aRows, .ws_col = aColumns, .ws_xpixel = 0, .ws_ypixel = 0};
        ioctl(mMaster.get(), TIOCSWINSZ, &lSize);
    }
    void forget() { mOutput.clear(); }
    int waitForExit() {
        int lStatus = 0;
        waitUntil([&] { return waitpid(mPid, &lStatus, WNOHANG) == mPid; }, "the program's end");
        mIsReaped = true;
        return WIFEXITED(lStatus) ? WEXITSTATUS(lStatus) : 1000 + WTERMSIG(lStatus);
    }

private:
    static std::vector<char*> sPointers(std::vector<std::string>& arTexts) {
        std::vector<char*> lPointers;
        for (std::string& lrText : arTexts) {
            lPointers.push_back(lrText.data());
        }
        lPointers.push_back(nullptr);
        return lPointers;
    }

    pid_t mPid = -1;
    ZTCFileDescriptor mMaster;
    std::string mOutput;
    bool mIsReaped = false;
};

class Terminal : public TavikProgram {
protected:
    std::string runOnTerminal(const std::vector<std::string>& acrArguments, unsigned short aColumns,
                              const std::map<std::string, std::string>& acrVariables = {}) {
        ZTSChildProcessSetup lSetup = setup(acrArguments);
        lSetup.mEnvironment["TERM"] = "xterm";
        for (const auto& [lName, lValue] : acrVariables) {
            lSetup.mEnvironment[lName] = lValue;
        }
        return ZTCTerminalRun(lSetup, aColumns, 24).readAll();
    }
};

TEST_F(Terminal, ColorIsForTerminalsThatAreNotAskedToDoWithout) {
    EXPECT_THAT(runOnTerminal({"status"}, 80), HasSubstr("\x1b[1;31mNOT COLLECTING\x1b[0m"));
    EXPECT_THAT(runOnTerminal({"status"}, 80, {{"NO_COLOR", "1"}}), Not(HasSubstr("\x1b")));
    EXPECT_THAT(runOnTerminal({"status"}, 80, {{"NO_COLOR", ""}}), HasSubstr("\x1b[1;31m"));
    EXPECT_THAT(runOnTerminal({"status"}, 80, {{"TERM", "dumb"}}), Not(HasSubstr("\x1b")));
    EXPECT_THAT(run({"status"}).mOutput, Not(HasSubstr("\x1b")));
}

TEST_F(Terminal, TablesFitTheTerminal) {
    fill();
    for (const unsigned short lColumns : std::initializer_list<unsigned short>{40, 60, 80, 200}) {
        std::istringstream lLines(runOnTerminal({"events"}, lColumns));
        int lCount = 0;
        for (std::string lLine; std::getline(lLines, lLine); ++lCount) {
            EXPECT_LE(countCharacters(lLine), lColumns + std::size_t{1})
                << lLine;  // and the terminal's carriage return
        }
        EXPECT_EQ(lCount, 4) << lColumns;
    }
    EXPECT_THAT(runOnTerminal({"events"}, 40), HasSubstr("queue-full"));
}

TEST_F(Terminal, TheLiveScreenIsDrawnAnewAndLeavesNothingBehind) {
    fill();
    const ZTCFakeSensor lSensor(controlPath(), ZTCFakeSensor::withState(makeLiveState()));
    ZTSChildProcessSetup lSetup = setup({"status", "--watch"});
    lSetup.mEnvironment["TERM"] = "xterm";
    ZTCTerminalRun lRun(lSetup, 80, 24);
    const std::string lFirst = lRun.readUntil("q: quit");
    EXPECT_THAT(lFirst, HasSubstr("\x1b[?1049h"));
    EXPECT_THAT(lFirst, HasSubstr("COLLECTING"));
    EXPECT_THAT(lFirst, HasSubstr("host8"));
    lRun.forget();
    lRun.resize(60, 12);
    EXPECT_THAT(lRun.readUntil("q: quit"), HasSubstr("\x1b[H"));
    lRun.type('q');
    EXPECT_THAT(lRun.readUntil("\x1b[?1049l"), HasSubstr("\x1b[?25h\x1b[?1049l"));
    EXPECT_EQ(lRun.waitForExit(), 0);
}

TEST_F(Terminal, TheLiveScreenEndsByTheInterruptKey) {
    ZTSChildProcessSetup lSetup = setup({"status", "--watch"});
    lSetup.mEnvironment["TERM"] = "xterm";
    ZTCTerminalRun lRun(lSetup, 80, 24);
    lRun.readUntil("q: quit");
    lRun.type('\x03');
    lRun.readUntil("\x1b[?1049l");
    EXPECT_EQ(lRun.waitForExit(), 3);
}
