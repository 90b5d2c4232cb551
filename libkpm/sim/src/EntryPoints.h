/// The library's table of functions, apart from the one symbol that hands it out, so that programs may link it too.
///
/// Init reads the scenario that KPM_SIM_SCENARIO names (unset or empty: the default one) and opens the socket that
/// KPM_SIM_SOCKET names (unset or empty: none). After Close it may be called again and reads both anew.
#ifndef LIBKPM_SIM_SRC_ENTRYPOINTS_H
#define LIBKPM_SIM_SRC_ENTRYPOINTS_H

#include "libkpm/include/libkpm.h"

const KPM_FunctionList* getSimFunctionList();

#endif
