/// The spool: a folder in which each response of the agent becomes a file before anything else happens to it.
///
/// ## Why nothing is lost
///
/// The agent keeps no copy of what it has written to the response FIFO, and there is no acknowledgement. From then on
/// the bytes exist once. This is where they are, step by step, and what a crash does at each step.
///
/// 1. *In the FIFO.* The keeper holds a read end of the FIFO for its whole life, so the bytes survive the death of the
///    collector. The next collector gets a read end from the keeper.
/// 2. *On the way into the file.* splice(2) moves bytes from the FIFO to the file inside the kernel. The bytes are
///    never in the collector's memory alone. SIGKILL ends the process before or after the move, not in between: either
///    the FIFO has the bytes or the file has them. When the disk is full, splice fails and the FIFO keeps the bytes.
/// 3. *In a `.part` file.* It holds the beginning of one frame: four bytes of length, then the body. Its size says how
///    many bytes have come, the length says how many belong to it. So the next collector knows exactly how many bytes
///    are still in the FIFO for this frame, and splices those. The size is exact because room is reserved with
///    FALLOC_FL_KEEP_SIZE, which changes no size.
/// 4. *In a `.frame` file.* The frame is whole. The rename from `.part` is atomic: a crash leaves one of the two names.
///    A `.part` that is already whole is renamed by the next collector.
/// 5. *In the database.* The transaction that stores a frame's records also stores the frame's number. The file is
///    removed after the commit has returned. A crash between the two leaves a file whose number the database has: the
///    next collector removes it and stores nothing. So nothing counts twice.
///
/// ## The request that may or may not have been sent
///
/// A `.part` is created before each request, so a `.part` in the folder says that a request may be on its way. If it
/// holds bytes, an answer has begun, and its rest will come. If it is empty, the collector died before or after it sent
/// the request, and nothing on the disk says which. Then the next collector sends a request that the agent always
/// refuses with a known status, and takes in every frame up to that refusal. Answers come in the order of the requests:
/// behind the refusal nothing is left over. Scope data in front of it are kept like any other.
///
/// Should two collectors die in a row like this, a refusal may still be on its way when the third one goes on. So a
/// frame that comes when nothing was asked is taken in as well: scope data are kept, other answers are dropped.
///
/// ## The agent that died
///
/// The keeper makes a new FIFO for each start of an agent, so bytes of two agents never mix. The old FIFO is emptied to
/// its end first. A frame that is still not whole then never will be: its `.part` becomes `.torn`, its whole records
/// are stored, and a gap says that something is missing.
///
/// ## Power cuts
///
/// The kernel may lose what was not synced. Frames are stored by a transaction that commits at least every second, and
/// the database syncs with each commit. A frame that has to wait longer is synced itself, and then the folder. So a
/// power cut costs at most the last second. A file that a power cut has damaged (shorter than its frame, or a length
/// that cannot be) is treated like a torn one.
///
/// ## The full disk
///
/// Before a request is sent, room for its answer is reserved. Without room nothing is asked: the agent goes on holding
/// its records, which is safe, and nothing is taken from it that has no place to go.
///
/// One thread at a time uses an object of this class. Another thread may read, sync, and remove frames and torn files:
/// these functions use no state but the folder.
#ifndef SENSOR_COLLECTOR_INCLUDE_SPOOL_H
#define SENSOR_COLLECTOR_INCLUDE_SPOOL_H

#include <algorithm>
#include <cstdint>
#include <string>
#include <vector>

#include "sensor/client/include/ClientErrors.h"
#include "sensor/client/include/FileDescriptor.h"
#include "sensor/collector/include/SpoolName.h"

/// Bytes reserved for an answer that may be scope data. A response is at most about 5 MB.
inline constexpr std::uint64_t gcResponseReserve = 8U << 20U;

/// Bytes reserved for an answer that says yes or no.
inline constexpr std::uint64_t gcShortReserve = 4096;

/// The spool's file system refuses: full, read-only, or failing. Nothing was lost; to be tried again later.
class ZTCSpoolTroubleEx : public ZTCSystemCallEx {
public:
    using ZTCSystemCallEx::ZTCSystemCallEx;
};

/// A `.part` that is open. Movable.
struct ZTSSpoolPart {
    ZTSSpoolName mName;
    ZTCFileDescriptor mFile;
    std::uint64_t mSize = 0;      ///< bytes that have arrived
    std::uint64_t mReserved = 0;  ///< bytes from the file's beginning for which there is room
};

/// A file of the spool, as list() finds it.
struct ZTSSpoolEntry {
    ZTSSpoolName mName;
    std::uint64_t mSize = 0;

    bool operator==(const ZTSSpoolEntry&) const = default;
};

class ZTCSpool {
public:
    /// Nothing is touched yet.
    explicit ZTCSpool(std::string aFolder) : mFolder(std::move(aFolder)) {}

    const std::string& getFolder() const { return mFolder; }

    // Each throws ZTCSpoolTroubleEx where the system refuses.

    /// Makes the folder (0700) where it is missing.
    void open();

    /// The spool's files in the order of their numbers. Files with other names are left out, and left alone.
    std::vector<ZTSSpoolEntry> list() const;

    /// The number of the next file. Numbers rise for ever; some may never be used.
    std::uint64_t takeNumber() { return mNextNumber++; }
    /// From now on numbers are at least this one.
    void raiseNumber(std::uint64_t aNumber) { mNextNumber = std::max(mNextNumber, aNumber); }

    /// Makes an empty `.part` with this room. Where there is no room, no file is left.
    ZTSSpoolPart createPart(std::uint64_t aNumber, const std::string& acrGeneration, std::uint64_t aReserve);
    /// Opens one that is there, to go on with it. Nothing is reserved yet.
    ZTSSpoolPart openPart(const ZTSSpoolName& acrName);
    /// Sees to it that there is room for this many bytes from the file's beginning.
    void reserve(ZTSSpoolPart& arPart, std::uint64_t aBytes);
    /// Gives unused room back and renames. Returns the new name; the part is closed.
    ZTSSpoolName finish(ZTSSpoolPart& arPart);
    /// The same for one that will never be whole. One without a byte is removed, and its own name is returned.
    ZTSSpoolName tear(ZTSSpoolPart& arPart);
    /// Closes and removes it: it holds nothing that is wanted.
    void discard(ZTSSpoolPart& arPart);

    // Also for other threads.

    /// The whole content of a frame or torn file.
    std::vector<std::uint8_t> read(const ZTSSpoolName& acrName) const;
    /// Does nothing where the file is gone.
    void remove(const ZTSSpoolName& acrName) const;
    /// Writes the file's content and its name to the disk.
    void sync(const ZTSSpoolName& acrName) const;

    std::string pathOf(const ZTSSpoolName& acrName) const { return mFolder + "/" + acrName.toText(); }

private:
    ZTSSpoolName settle(ZTSSpoolPart& arPart, ZTESpoolState aState);

    const std::string mFolder;
    std::uint64_t mNextNumber = 1;
};

#endif
