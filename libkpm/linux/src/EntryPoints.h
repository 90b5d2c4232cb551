/// The library's table of functions, apart from the one symbol that hands it out, so that programs may link it too.
///
/// Init reads these variables of the environment; one that is unset or empty changes nothing:
///   KPM_LINUX_INSTANCE  the directory of a trace instance that was prepared for the agent
///   KPM_LINUX_PROBE     0: no probe is used; 1: sense data come by the probe even where the trace has them, for tests
///   KPM_LINUX_SYSFS     in place of /sys, for tests
///   KPM_LINUX_TRACEFS   in place of where tracefs usually is, for tests
#ifndef LIBKPM_LINUX_SRC_ENTRYPOINTS_H
#define LIBKPM_LINUX_SRC_ENTRYPOINTS_H

#include "libkpm/include/libkpm.h"

const KPM_FunctionList* getLinuxFunctionList();

#endif
