/// A watcher of hosts over the fake kernel, with a registry of the test's own. The test calls what the engine's thread
/// would call.
#ifndef TESTS_UNIT_LINUX_WATCHERFIXTURE_H
#define TESTS_UNIT_LINUX_WATCHERFIXTURE_H

#include <gtest/gtest.h>

#include "libkpm/linux/src/HostWatcher.h"
#include "libkpm/linux/src/KindSources.h"
#include "libkpm/linux/src/Losses.h"
#include "tests/unit/linux/FakeKernel.h"

class ZTCWatcherFixture : public testing::Test {
protected:
    ZTCLinuxLog mLog;
    ZTCFakeKernel mKernel;
    ZTCSysfs mSysfs{mKernel.sysfs()};
    ZTCLibraryRegistry mRegistry{gcLinuxKindCount};
    ZTCLinuxDelivery mDelivery{mRegistry};
    ZTCLosses mLosses{gcLinuxLosses};
    ZTCLinuxHostWatcher mWatcher{mSysfs, mDelivery, mLosses};
};

#endif
