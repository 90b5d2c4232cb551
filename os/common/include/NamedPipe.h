/// A FIFO in the file system that carries frames: a length of four bytes in network order, then the message.

#ifndef OS_COMMON_INCLUDE_NAMEDPIPE_H
#define OS_COMMON_INCLUDE_NAMEDPIPE_H

#include <chrono>
#include <cstdint>

#include "common/include/Buffer.h"
#include "common/include/Pointer.h"
#include "common/include/String.h"
#include "os/common/include/FrameAssembler.h"
#include "os/common/include/Ipc.h"

enum ZTEPipeState : unsigned char { ZTNPS_None = 0, ZTNPS_Block = 1, ZTNPS_NonBlock = 2, ZTNPS_Max = 3 };

enum ZTEFileMode : unsigned char {
    ZTFM_None = 0,
    ZTFM_Read = 1,
    ZTFM_Write = 2,
    ZTFM_ReadWrite = 3,
    ZTFM_Append = 4,
    ZTFM_Max = 5
};

enum ZTEConnectionMode : unsigned char { ZTCM_Client = 0, ZTCM_Server = 1 };

/// One end of a FIFO. open(), close(), create() and destroy() belong to the main thread while no other runs. In between
/// one thread calls read() and waitForActivity(), or write(). SIGPIPE is ignored by the process.
///
/// The exit event (getExitEvent) ends every wait. The stop event (getStopEvent) ends the wait of open().
class ZTCNamedPipe : public ZTCIpc {
public:
    /// Nothing is made or opened yet. The mode is ZTFM_Read or ZTFM_Write; every other one is refused by open() with
    /// ZTCNotImplementedEx.
    ZTCNamedPipe(const ZTCString& acrPath, ZTEFileMode aFileMode, ZTEPipeState aPipeState,
                 ZTEConnectionMode aConnectionMode);

    /// Closes what is open; leaves the FIFO where it is.
    ~ZTCNamedPipe() override;

    /// Makes the FIFO, with mode 0600, or takes over one that is there, with a warning line where that is another
    /// user's, or is open to more than its owner. Anything else at the path is left untouched:
    /// ZTCInvalidEx that names the path and what is there.
    void create() override;

    /// Opens the path, which has to be a FIFO (ZTCInvalidEx). For reading it never waits, in either state, and holds a
    /// writing end of its own, so that a sensor that goes leaves no end of file behind. For writing it needs a reader:
    /// in the state ZTNPS_NonBlock ZTCClibOpenFailedEx without one; in the state ZTNPS_Block it waits for one, trying
    /// again several times a second, until the stop event: ZTCExitConditionEx (19).
    void open() override;

    /// Closes what is open, and throws away a message that was not read.
    void close() override;

    /// Removes the FIFO. None there is fine; anything else there is left, with a warning line.
    void destroy() override;

    /// A FIFO has no connections: does nothing.
    void accept() override;

    /// Hands over the message that waitForActivity() found. Throws ZTCClibReadFailedEx where there is none.
    void read(ZTCPointer<ZTCBuffer>& arBuffer, unsigned& arCount);

    /// Writes the length and the message, waiting for room. Throws ZTCClibWriteFailedEx, with the bytes written and
    /// wanted, if the reader has gone, or if the exit event comes while there is no room; a part may have been written
    /// then. arCount is the number of the message's bytes that were written.
    void write(const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned& arCount);

    /// Waits until a whole message is there or the exit event is raised, and returns; throws ZTCTimeOutEx when the time
    /// passes without one. While a message is arriving the time counts from its last byte.
    /// Broken input is thrown away, with one error line each. A length of 0 or above 1048576: everything that waits in
    /// the pipe. A message whose rest does not come within the time: its part.
    void waitForActivity(unsigned aSeconds);
    void waitForActivity(std::chrono::milliseconds aTime);

    const ZTCString& getPath() const { return mPath; }

private:
    void openForReading();
    void openForWriting();
    bool readAvailable();
    void discardBrokenFrame();
    void discardPartialFrame();
    std::size_t drain(std::uint64_t aMost);

    ZTCString mPath;
    int mDescriptor = 0;  // 0: not open, which no open one is
    ZTEPipeState mPipeState;
    ZTEFileMode mFileMode;
    ZTEConnectionMode mConnectionMode;

    int mOwnWriterDescriptor = 0;  // held by a reader alone
    ZTCFrameAssembler mAssembler;
};

#endif
