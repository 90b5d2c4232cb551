/// The border between a test and the module unit-libkpm, which it loads into its own process: the module's functions do
/// nothing but ask the test.
#ifndef TESTS_UNIT_AGENTCOMMON_SUPPORT_UNITLIBKPM_H
#define TESTS_UNIT_AGENTCOMMON_SUPPORT_UNITLIBKPM_H

#include "libkpm/testing/include/TestLibrary.h"

/// The module's second symbol: it sets the object that answers from now on. The first is that of every adapters'
/// library.
inline constexpr const char* gcSetBehaviourSymbol = "UnitLibkpm_setBehaviour";
using ZTPSetBehaviour = void (*)(ZTCTestLibrary*);

#endif
