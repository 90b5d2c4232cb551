/// Puts frames together from bytes that come in any splitting.
///
/// A frame is a length of four bytes in network order, then that many bytes, its body. The assembler makes no system
/// call and asks for no byte past the frame it is assembling: first the rest of the length, then the rest of the body.
/// The length is compared with the limit before anything is allocated for it.
///
///     while (lAssembler.getState() == ZTFS_Incomplete) {
///         lCount = read(fd, lAssembler.getSpace(), lAssembler.getWanted());
///         lAssembler.commit(lCount);
///     }
///
/// Belongs to one thread at a time.

#ifndef OS_COMMON_INCLUDE_FRAMEASSEMBLER_H
#define OS_COMMON_INCLUDE_FRAMEASSEMBLER_H

#include "common/include/Buffer.h"
#include "common/include/Framing.h"
#include "common/include/Pointer.h"
#include "common/include/Types.h"

enum ZTEFrameState : unsigned char {
    ZTFS_Incomplete = 0,  ///< more bytes are wanted
    ZTFS_Complete = 1,    ///< the body can be taken
    ZTFS_BadLength = 2    ///< the length is 0 or above the limit; only reset() leaves this state
};

class ZTCFrameAssembler {
public:
    static constexpr Size gcHeaderSize = gcFrameHeaderSize;

    explicit ZTCFrameAssembler(Size aMaxBodySize = gcMaxRequestSize);

    ZTEFrameState getState() const { return mState; }

    /// How many bytes come next, and where they go. 0 unless the state is incomplete. The first getSpace() of a body
    /// allocates its memory. After ZTCNoMemoryEx it may be called again.
    Size getWanted() const;
    unsigned char* getSpace();

    /// Takes in aCount of the wanted bytes, which are at the space now. Throws ZTCInvalidEx where aCount is more than
    /// were wanted.
    void commit(Size aCount);

    /// Bytes that have come of this frame, the length's 4 included.
    Size getHad() const { return mHad; }

    /// The size of the whole frame: the 4 bytes of the length and the body; 4 until the length has come.
    std::uint64_t getTotal() const;

    /// What the length says; 0 until it is there.
    Size getLength() const { return mLength; }

    /// The body of a complete frame. The assembler then waits for the next one. Throws ZTCInvalidEx in another state.
    ZTCPointer<ZTCBuffer> take();

    /// Forgets the frame in hand.
    void reset();

private:
    const Size mMaxBodySize;

    ZTEFrameState mState = ZTFS_Incomplete;
    unsigned char mHeader[gcHeaderSize] = {};
    Size mLength = 0;
    Size mHad = 0;
    ZTCPointer<ZTCBuffer> mBody;
};

#endif
