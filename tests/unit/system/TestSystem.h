/// A system whose slots a test can reach, with the agent's options, and events that are down before and after.
#ifndef TESTS_UNIT_SYSTEM_TESTSYSTEM_H
#define TESTS_UNIT_SYSTEM_TESTSYSTEM_H

#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "os/common/include/ProcessEvents.h"
#include "system/include/System.h"

class ZTCTestSystem : public ZTCSystem {
public:
    explicit ZTCTestSystem(const std::string& acrPidFilePath = "") : ZTCSystem(ZTCString("test-system")) {
        getStopEvent().reset();
        getExitEvent().reset();
        setPidFilePathStr(ZTCString(acrPidFilePath.c_str()));
        mInstanceManager =
            ZTCPointer<ZTCProcessInstanceManager>(NEW ZTCProcessInstanceManager(ZTCString(acrPidFilePath.c_str())));
        mVersion = ZTCPointer<ZTCVersion>(NEW ZTCVersion(3, 0, 1, 2));
    }
    ~ZTCTestSystem() override {
        getStopEvent().reset();
        getExitEvent().reset();
        ZTCProtocolHelper::setSnifferMode(false);
    }

    void setCmdLineArgDescs() override {
        const struct {
            const char* mpIdentifier;
            ZTECommandLineArgumentType mType;
        } lcRows[] = {{"-h", ZTCLAT_OptionOnly},  {"-v", ZTCLAT_OptionOnly},  {"-s", ZTCLAT_OptionOnly},
                      {"-D", ZTCLAT_OptionValue}, {"-l", ZTCLAT_OptionValue}, {"-d", ZTCLAT_OptionValue},
                      {"-c", ZTCLAT_OptionValue}, {"-S", ZTCLAT_OptionOnly},  {"-b", ZTCLAT_OptionValue}};
        for (const auto& lcrRow : lcRows) {
            ZTSCommandLineArgumentDesc lDesc{};
            lDesc.type = lcrRow.mType;
            std::strcpy(lDesc.identifier, lcrRow.mpIdentifier);
            mCmdLineArgDescs.add(lDesc);
        }
    }

    void displayHelp() override { std::cout << "the help" << std::endl; }

    /// Reads and applies a command line.
    void applyLine(std::vector<std::string> aArguments) {
        readLine(std::move(aArguments));
        processCommandLineArguments();
    }

    void readLine(std::vector<std::string> aArguments) {
        aArguments.insert(aArguments.begin(), "program");
        std::vector<char*> lArgv;
        for (std::string& lrArgument : aArguments) {
            lArgv.push_back(lrArgument.data());
        }
        lArgv.push_back(nullptr);
        processCommandLine(static_cast<int>(aArguments.size()), lArgv.data());
    }

    void addComponent(ZTCThreadComponent* apComponent) {
        mThreadComponents.add(ZTCPointer<ZTCThreadComponent>(apComponent));
    }
    void addConditional() { mConditionals.add(ZTCPointer<ZTCConditional>(NEW ZTCConditional())); }
    void addList() { mLists.add(ZTCPointer<ZTCSynchList>(NEW ZTCSynchList())); }
    void addQueue() { mQueues.add(ZTCPointer<ZTCSynchQueue>(NEW ZTCSynchQueue())); }
    void addReader(ZTCReader* apReader) { mReaders.add(ZTCPointer<ZTCReader>(apReader)); }
    void addWriter(ZTCWriter* apWriter) { mWriters.add(ZTCPointer<ZTCWriter>(apWriter)); }
    ZTCConditional& conditional(unsigned aIndex) { return *mConditionals.get(aIndex); }
};

/// A component that runs a function of the test.
class ZTCFunctionComponent : public ZTCThreadComponent {
public:
    using Function = std::function<void(ZTCFunctionComponent&, ZTCSystem&)>;

    ZTCFunctionComponent(ZTCSystem& arSystem, const char* apName, Function aFunction)
        : ZTCThreadComponent(runFunction, ZTCString(apName), &arSystem), mFunction(std::move(aFunction)) {}

    void finish() override { ++mNumberOfFinishes; }
    int numberOfFinishes() const { return mNumberOfFinishes; }

private:
    static void* runFunction(void* apArguments) {
        const auto& lcrArguments = *static_cast<ZTSThreadArguments*>(apArguments);
        auto& lrComponent = dynamic_cast<ZTCFunctionComponent&>(*lcrArguments.mpThreadComponent);
        lrComponent.mFunction(lrComponent, dynamic_cast<ZTCSystem&>(*lcrArguments.mpSystemInterface));
        return nullptr;
    }

    const Function mFunction;
    std::atomic<int> mNumberOfFinishes{0};
};

#endif
