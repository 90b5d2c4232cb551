/// Switches the trace instance off where the process ends with the library open. Exit-time code may run while the
/// library's threads do: it writes to one file that was opened before, and nothing else.
#ifndef LIBKPM_LINUX_SRC_EXITSWITCH_H
#define LIBKPM_LINUX_SRC_EXITSWITCH_H

#include "libkpm/common/include/Descriptor.h"

/// The file to write "0" to at exit. Replaces the one before.
void armLinuxExitSwitch(ZTCLibraryDescriptor aFile) noexcept;

/// Closes the file, unless the process is already at its exit.
void disarmLinuxExitSwitch() noexcept;

/// Writes "0" to the file, if there is one. For exit-time code.
void pullLinuxExitSwitch() noexcept;

/// Whether that has happened: what is switched on now stays on.
bool isLinuxExitSwitchPulled() noexcept;

#endif
