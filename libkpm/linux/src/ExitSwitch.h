/// Switches the trace events off where the process ends with the library open. Exit-time code may run while the
/// library's threads do: it writes to files that were opened before, and does nothing else.
#ifndef LIBKPM_LINUX_SRC_EXITSWITCH_H
#define LIBKPM_LINUX_SRC_EXITSWITCH_H

#include <cstdint>

#include "libkpm/common/include/Descriptor.h"

/// The events that are switched off.
enum ZTEExitSwitch : std::uint8_t { ZTXS_Outcomes, ZTXS_Sense };

/// The event's file, to write "0" to at exit. Replaces the one before.
void armLinuxExitSwitch(ZTEExitSwitch aEvent, ZTCLibraryDescriptor aFile) noexcept;

/// Closes the event's file, unless the process is already at its exit.
void disarmLinuxExitSwitch(ZTEExitSwitch aEvent) noexcept;

/// Writes "0" to the files there are. For exit-time code.
void pullLinuxExitSwitch() noexcept;

/// Whether that has happened: what is switched on now stays on.
bool isLinuxExitSwitchPulled() noexcept;

#endif
