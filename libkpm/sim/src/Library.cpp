// The one symbol of the shared library.
#include "libkpm/include/libkpm.h"
#include "libkpm/sim/src/EntryPoints.h"

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t version,
                                                                               const KPM_FunctionList** list) {
    if (version != KPM_INTERFACE_VERSION || list == nullptr) {
        return 1;
    }
    *list = getSimFunctionList();
    return 0;
}
