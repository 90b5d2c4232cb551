/// An agent's side of the library for tests: callbacks that write down what they are given, one text an event.
#ifndef TESTS_UNIT_LINUX_LINUXRECORDER_H
#define TESTS_UNIT_LINUX_LINUXRECORDER_H

#include <cstddef>
#include <cstdint>
#include <functional>
#include <mutex>
#include <string>
#include <vector>

#include "libkpm/include/libkpm.h"
#include "libkpm/linux/src/Engine.h"

/// The one recorder of a test: two kinds of callbacks have no context.
class ZTCLinuxRecorder {
public:
    ZTCLinuxRecorder();
    ~ZTCLinuxRecorder();
    ZTCLinuxRecorder(const ZTCLinuxRecorder&) = delete;
    ZTCLinuxRecorder& operator=(const ZTCLinuxRecorder&) = delete;

    /// Registers everything that the kernel has a source for on a board.
    void registerAll(ZTCLinuxEngine& arEngine, std::uint32_t aBoard);

    /// What was delivered, in order:
    ///   "BOARD queue-full PORT LUN", device-busy likewise
    ///   "BOARD check-condition PORT LUN OPCODE KEY ASC ASCQ", in hex
    ///   "BOARD queue-depth PORT LUN OLD->NEW", the depths in decimal
    ///   "BOARD link up|down tag=N up=N down=N id=HEX PORT NODE"
    ///   "BOARD rscn BYTES", in hex
    ///   "BOARD arrival"
    /// names by their last byte, in hex.
    std::vector<std::string> events() const;
    std::size_t count() const { return events().size(); }
    /// Waits until there are as many, and returns them.
    std::vector<std::string> waitFor(std::size_t aCount) const;

    /// Called inside of every callback.
    void setHook(std::function<void()> aHook) { mHook = std::move(aHook); }

    void record(const std::string& acrText);

    static void onScope(unsigned aBoard, HBA_wwn aPort, unsigned aCategory, unsigned aSubcategory, void* apContext,
                        ZT_event* apEvent);
    static KPM_EventCallback linkCallback();
    static KPM_EventCallback rscnCallback();

private:
    std::function<void()> mHook;
    mutable std::mutex mLock;
    std::vector<std::string> mEvents;  // guarded by mLock
};

#endif
