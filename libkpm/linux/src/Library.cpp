// The one symbol of the shared library, and its exit-time code.
#include "libkpm/include/libkpm.h"
#include "libkpm/linux/src/EntryPoints.h"
#include "libkpm/linux/src/ExitSwitch.h"

extern "C" __attribute__((visibility("default"))) uint32_t KPM_GetFunctionList(uint32_t version,
                                                                               const KPM_FunctionList** list) {
    if (version != KPM_INTERFACE_VERSION || list == nullptr) {
        return 1;
    }
    *list = getLinuxFunctionList();
    return 0;
}

/// At exit, and when the library is unloaded, which does no harm: Close has disarmed the switch.
__attribute__((destructor)) static void sAtExit() {
    pullLinuxExitSwitch();
}
