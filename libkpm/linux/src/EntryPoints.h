/// The library's table of functions, apart from the one symbol that hands it out, so that programs may link it too.
///
/// Init reads where sysfs and tracefs are from KPM_LINUX_SYSFS and KPM_LINUX_TRACEFS (unset or empty: where the
/// kernel's own are), which are there for tests.
#ifndef LIBKPM_LINUX_SRC_ENTRYPOINTS_H
#define LIBKPM_LINUX_SRC_ENTRYPOINTS_H

#include "libkpm/include/libkpm.h"

const KPM_FunctionList* getLinuxFunctionList();

#endif
