// The messages of the kernel's FC transport: whatever bytes a datagram has, its events are those that stand in it,
// every message is an event, is passed over, or is counted; RSCNs are made whole; numbers that were passed over are
// counted once; and the changes of a link that come of messages and readings alternate and end at what was read.
//
// Input: a byte (1: big-endian; 2, 4: where the bytes lie in memory), then datagrams: the length (16 bits), the bytes,
// and a byte with the state that is read of the link after it.
#include <algorithm>
#include <cstring>
#include <set>
#include <string>
#include <vector>

#include "fuzz/support/FuzzInput.h"
#include "fuzz/support/FuzzKernel.h"
#include "libkpm/linux/src/EventSequence.h"
#include "libkpm/linux/src/FcMessage.h"
#include "libkpm/linux/src/LinkState.h"

struct ZTSExpected {
    std::vector<std::size_t> mEvents;  // offsets of messages that are events
    std::uint64_t mMalformed = 0;
};

enum ZTEKindOfMessage { ZTKM_Event, ZTKM_Other, ZTKM_Malformed };

/// By the table at the head of the reader.
static ZTEKindOfMessage sKindOf(ZTCByteSpan aMessage, std::endian aOrder) {
    const auto lNumber = [&](std::size_t aOffset, std::size_t aSize) {
        return fuzzNumber(aMessage, aOffset, aSize, aOrder);
    };
    if (lNumber(4, 2) != 0x11) {
        return ZTKM_Other;
    }
    if (!isInside(aMessage, 16, 8) || aMessage[16] != 1 || lNumber(18, 2) != 0xA1B2) {
        return ZTKM_Malformed;
    }
    if (aMessage[17] != 1 || lNumber(20, 2) != 0x100) {
        return ZTKM_Other;
    }
    if (!isInside(aMessage, 24, 28)) {
        return ZTKM_Malformed;
    }
    return isInside(aMessage, 52, lNumber(42, 2)) ? ZTKM_Event : ZTKM_Malformed;
}

static ZTSExpected sExpected(ZTCByteSpan aDatagram, std::endian aOrder) {
    ZTSExpected lExpected;
    for (std::size_t lPlace = 0; lPlace < aDatagram.size();) {
        const std::size_t lLeft = aDatagram.size() - lPlace;
        const std::uint64_t lLength = lLeft < 16 ? 0 : fuzzNumber(aDatagram, lPlace, 4, aOrder);
        if (lLength < 16 || lLength > lLeft) {
            ++lExpected.mMalformed;
            break;
        }
        const ZTEKindOfMessage lKind = sKindOf(aDatagram.subspan(lPlace, lLength), aOrder);
        if (lKind == ZTKM_Event) {
            lExpected.mEvents.push_back(lPlace);
        }
        lExpected.mMalformed += lKind == ZTKM_Malformed ? 1 : 0;
        lPlace += (lLength + 3) / 4 * 4;
    }
    return lExpected;
}

static void sCheckRscn(ZTCByteSpan aData, std::endian aOrder) {
    const auto lPayload = makeLinuxRscn(aData, aOrder);
    const bool lIsWhole = !aData.empty() && aData.size() % 4 == 0 && aData.size() + 4 <= 0xFFFF;
    ZT_FUZZ_REQUIRE(lPayload.has_value() == lIsWhole, std::to_string(aData.size()));
    if (!lIsWhole) {
        return;
    }
    const ZTCByteSpan lBytes(*lPayload);
    ZT_FUZZ_REQUIRE(lBytes.size() == 4 + aData.size(), std::to_string(lBytes.size()));
    ZT_FUZZ_REQUIRE(lBytes[0] == 0x61 && lBytes[1] == 4, std::to_string(lBytes[0]));
    ZT_FUZZ_REQUIRE(fuzzNumber(lBytes, 2, 2, std::endian::big) == lBytes.size(), std::to_string(lBytes.size()));
    for (std::size_t lPage = 0; lPage < aData.size(); lPage += 4) {
        ZT_FUZZ_REQUIRE(fuzzNumber(lBytes, 4 + lPage, 4, std::endian::big) == fuzzNumber(aData, lPage, 4, aOrder),
                        std::to_string(lPage));
    }
}

/// The count of lost numbers by the definition, one number at a time. It knows no bound of what may be late, or be kept
/// in mind, and so is asked only where numbers stay near each other and gaps are few.
class ZTCNumbers {
public:
    void note(std::uint32_t aNumber) {
        if (!mHasBegun) {
            mHasBegun = true;
        } else if (aNumber - mNext < scNear) {
            for (; mNext != aNumber; ++mNext) {
                mMissing.insert(mNext);
            }
        } else if (mNext - aNumber <= scNear) {
            mMissing.erase(aNumber);
            return;
        } else {
            mIsFar = true;
        }
        mNext = aNumber + 1;
    }

    bool isKnown() const { return !mIsFar && mMissing.size() <= scFew; }
    std::uint64_t takeLost() {
        mIsFar = false;
        const std::uint64_t lLost = mMissing.size();
        mMissing.clear();
        return lLost;
    }

private:
    static constexpr std::uint32_t scNear = 1024;
    static constexpr std::size_t scFew = 32;

    bool mHasBegun = false;
    bool mIsFar = false;
    std::uint32_t mNext = 0;
    std::set<std::uint32_t> mMissing;
};

/// Compares the reported changes with what a link can do.
class ZTCLinkWatch {
public:
    void noteMessage(std::uint32_t aCode) {
        if (aCode == ZTLFC_LinkUp || aCode == ZTLFC_LinkDown) {
            mLink.noteMessage(aCode == ZTLFC_LinkUp);
            ++mMessages;
        }
    }

    void noteReading(ZTELinuxLink aState) {
        const std::vector<ZTSLinuxLinkChange> lChanges = mLink.noteReading(aState);
        mMost += mMessages + 1;
        mMessages = 0;
        for (const ZTSLinuxLinkChange& lrChange : lChanges) {
            ZT_FUZZ_REQUIRE(mState != ZTLK_Unknown && lrChange.mIsUp != (mState == ZTLK_Up), "two changes alike");
            ++(lrChange.mIsUp ? mUp : mDown);
            mState = lrChange.mIsUp ? ZTLK_Up : ZTLK_Down;
            ZT_FUZZ_REQUIRE(lrChange.mUp == mUp && lrChange.mDown == mDown && lrChange.mTag == mUp + mDown,
                            std::to_string(lrChange.mTag));
        }
        mState = mState == ZTLK_Unknown ? aState : mState;
        ZT_FUZZ_REQUIRE(aState == ZTLK_Unknown || aState == mState, "the last change is not what was read");
        ZT_FUZZ_REQUIRE(mUp + mDown <= mMost, std::to_string(mUp + mDown) + " of " + std::to_string(mMost));
    }

    void forget() { mLink.forgetMessages(); }

private:
    ZTCLinuxLinkState mLink;
    ZTELinuxLink mState = ZTLK_Unknown;
    std::uint64_t mMessages = 0;
    std::uint64_t mMost = 0;  // a change for each message and each reading
    std::uint32_t mUp = 0;
    std::uint32_t mDown = 0;
};

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    ZTCFuzzInput lInput(apData, aSize);
    const std::uint8_t lOptions = lInput.takeByte();
    const std::endian lOrder = (lOptions & 1) != 0 ? std::endian::big : std::endian::little;
    ZTCLinuxEventSequence lSequence;
    ZTCNumbers lNumbers;
    ZTCLinkWatch lLink;
    while (!lInput.isAtEnd()) {
        const ZTCByteSpan lTaken = lInput.take(lInput.takeShort());
        const ZTCExactBlock lBlock(lTaken, lOptions >> 1 & 3);
        const ZTCByteSpan lDatagram(lBlock.get(), lTaken.size());
        const ZTSExpected lExpected = sExpected(lDatagram, lOrder);

        ZTCLinuxFcMessages lMessages(lDatagram, lOrder);
        std::size_t lCount = 0;
        while (const auto lEvent = lMessages.next()) {
            ZT_FUZZ_REQUIRE(lCount < lExpected.mEvents.size(), std::to_string(lCount));
            const std::size_t lPlace = lExpected.mEvents[lCount++];
            ZT_FUZZ_REQUIRE(lEvent->mHost == fuzzNumber(lDatagram, lPlace + 40, 2, lOrder), "host");
            ZT_FUZZ_REQUIRE(lEvent->mNumber == fuzzNumber(lDatagram, lPlace + 44, 4, lOrder), "number");
            ZT_FUZZ_REQUIRE(lEvent->mCode == fuzzNumber(lDatagram, lPlace + 48, 4, lOrder), "code");
            ZT_FUZZ_REQUIRE(lEvent->mData.data() == lDatagram.data() + lPlace + 52, "data");
            ZT_FUZZ_REQUIRE(lEvent->mData.size() == fuzzNumber(lDatagram, lPlace + 42, 2, lOrder), "size");
            sCheckRscn(lEvent->mData, lOrder);
            lSequence.note(lEvent->mNumber);
            lNumbers.note(lEvent->mNumber);
            lLink.noteMessage(lEvent->mCode);
        }
        ZT_FUZZ_REQUIRE(lCount == lExpected.mEvents.size(), std::to_string(lCount));
        ZT_FUZZ_REQUIRE(lMessages.getMalformed() == lExpected.mMalformed, std::to_string(lMessages.getMalformed()));

        const bool lIsKnown = lNumbers.isKnown();
        const std::uint64_t lMissing = lNumbers.takeLost();
        const std::uint64_t lLost = lSequence.takeLost();
        ZT_FUZZ_REQUIRE(!lIsKnown || lLost == lMissing, std::to_string(lLost) + " of " + std::to_string(lMissing));
        ZT_FUZZ_REQUIRE(lSequence.takeLost() == 0, "counted twice");

        const std::uint8_t lReading = lInput.takeByte();
        lLink.noteReading(static_cast<ZTELinuxLink>(lReading % 3));
        if ((lReading & 0x80) != 0) {
            lLink.forget();
        }
    }
    return 0;
}
