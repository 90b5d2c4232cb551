/// The state of one board's link, and which changes of it are to be told. It follows two witnesses: the state that is
/// read, which counts, and messages that a link went up or down, which only show a change that came and went between
/// two readings. Pure.
#ifndef LIBKPM_LINUX_SRC_LINKSTATE_H
#define LIBKPM_LINUX_SRC_LINKSTATE_H

#include <cstdint>
#include <vector>

#include "libkpm/linux/src/SysfsText.h"

/// One change as the link callback tells it.
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

    /// The state was read. The first state that is known is no change; after that, each differing one is. A message of
    /// the other state and then one of this state, with this state read throughout, are two changes.
    std::vector<ZTSLinuxLinkChange> noteReading(ZTELinuxLink aState);

    /// Messages before this say nothing about what comes.
    void forgetMessages();

    bool isUp() const { return mState == ZTLK_Up; }

private:
    ZTSLinuxLinkChange makeChange(bool aIsUp);

    ZTELinuxLink mState = ZTLK_Unknown;
    bool mWasToldOther = false;
    bool mHasFlapped = false;
    std::uint32_t mUp = 0;
    std::uint32_t mDown = 0;
};

#endif
