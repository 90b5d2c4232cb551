/// The state of one board's link, and which of its changes are to be reported. Two sources show the same changes: the
/// state that is read, and messages that the link went up or down. Either may be ahead of the other. A change may have
/// several messages or none. A change that came and went between two readings has only messages. Pure.
#ifndef LIBKPM_LINUX_SRC_LINKSTATE_H
#define LIBKPM_LINUX_SRC_LINKSTATE_H

#include <cstdint>
#include <vector>

#include "libkpm/linux/src/SysfsText.h"

/// One change as the link callback reports it.
struct ZTSLinuxLinkChange {
    bool mIsUp = false;
    std::uint32_t mTag = 0;  ///< number of this change
    std::uint32_t mUp = 0;   ///< changes to up so far
    std::uint32_t mDown = 0;
};

class ZTCLinuxLinkState {
public:
    /// A message said that the link went up, or down. Followed by a reading.
    void noteMessage(bool aIsUp);

    /// The state was read. The first known state is not reported. Every later difference is. A flap seen only in
    /// messages is reported as two changes.
    std::vector<ZTSLinuxLinkChange> noteReading(ZTELinuxLink aState);

    /// No message that was sent before the last reading is still to come.
    void forgetMessages();

    bool isUp() const { return mState == ZTLK_Up; }

private:
    ZTSLinuxLinkChange makeChange(bool aIsUp);

    ZTELinuxLink mState = ZTLK_Unknown;
    bool mIsToldUp = false;     // what the last message said, or would have said
    std::uint32_t mUntold = 0;  // changes reported by messages that no reading has shown
    std::uint32_t mAhead = 0;   // changes shown by a reading that no message has reported
    std::uint32_t mUp = 0;
    std::uint32_t mDown = 0;
};

#endif
