#include "tests/faults/FaultInjection.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <new>
#include <stdexcept>

ZTCFaultSwitch::ZTCFaultSwitch(std::string aPath) : mPath(std::move(aPath)) {
    const int lFile = open(mPath.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
    void* lpMapped = MAP_FAILED;
    if (lFile >= 0 && ftruncate(lFile, sizeof(ZTSFaultControl)) == 0) {
        lpMapped = mmap(nullptr, sizeof(ZTSFaultControl), PROT_READ | PROT_WRITE, MAP_SHARED, lFile, 0);
    }
    const int lErrno = errno;
    if (lFile >= 0) {
        close(lFile);
    }
    if (lpMapped == MAP_FAILED) {
        throw std::runtime_error("cannot map " + mPath + ": " + std::strerror(lErrno));
    }
    mpControl = new (lpMapped) ZTSFaultControl{};
}

ZTCFaultSwitch::~ZTCFaultSwitch() {
    munmap(mpControl, sizeof(*mpControl));
}

std::map<std::string, std::string> ZTCFaultSwitch::getEnvironment(const std::string& acrProgram) const {
    return {{"LD_PRELOAD", TAVIK_INTERPOSER}, {gcFaultFileVariable, mPath}, {gcFaultProgramVariable, acrProgram}};
}

ZTCFaultInjection::ZTCFaultInjection(ZTCAgentProcess& arAgent)
    : ZTCFaultSwitch(arAgent.agentLogPath() + ".faults"), mrAgent(arAgent) {
    mrAgent.setEnvironment("LD_PRELOAD", TAVIK_INTERPOSER);
    attach();
}

void ZTCFaultInjection::attach() {
    mrAgent.setEnvironment(gcFaultFileVariable, getPath());
}

void ZTCFaultInjection::detach() {
    mrAgent.unsetEnvironment(gcFaultFileVariable);
}

void ZTCFaultSwitch::arm(const ZTSFaultPlan& acrPlan) {
    disarm();
    if (acrPlan.mCall.size() >= sizeof(mpControl->mCall)) {
        throw std::runtime_error("no call has so long a name: " + acrPlan.mCall);
    }
    std::memset(mpControl->mCall, 0, sizeof(mpControl->mCall));
    acrPlan.mCall.copy(mpControl->mCall, acrPlan.mCall.size());
    mpControl->mNth = acrPlan.mNth;
    mpControl->mErrno = acrPlan.mErrno;
    mpControl->mCount = acrPlan.mCount;
    mpControl->mIsLasting = acrPlan.mIsLasting ? 1 : 0;
    mpControl->mSpan = acrPlan.mSpan;
    mpControl->mIsOfLibrary = acrPlan.mIsOfLibrary ? 1 : 0;
    mpControl->mCalls.store(0);
    mpControl->mFired.store(0);
    mpControl->mPlace.store(0);
    mpControl->mFirstTime.store(0);
    mpControl->mIsArmed.store(1);
}
