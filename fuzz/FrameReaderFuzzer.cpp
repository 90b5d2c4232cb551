// The reader of frames: whatever bytes come, in whatever pieces, its frames are those that stand in them. Once through
// the assembler, which keeps a part for the next piece, and once through the agent's own FIFO reader, whose wait throws
// a part away when nothing more comes.
//
// Input: a byte that says how many pieces there are, the pieces' lengths (16 bits each), then the stream.
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "common/include/Exception.h"
#include "fuzz/support/FuzzAgent.h"
#include "fuzz/support/FuzzInput.h"
#include "os/common/include/FrameAssembler.h"
#include "os/common/include/NamedPipe.h"

using ZTCPiece = std::span<const std::uint8_t>;

static constexpr std::size_t scMaxFrame = 1048576;
static constexpr std::size_t scPipeRoom = 65536;

/// The frames in bytes, by the definition. A part at the end stays in arRest; a bad length throws everything away.
static std::vector<std::string> sFramesIn(std::string& arRest) {
    std::vector<std::string> lFrames;
    while (arRest.size() >= 4) {
        std::size_t lLength = 0;
        for (std::size_t lByte = 0; lByte < 4; ++lByte) {
            lLength = lLength << 8 | static_cast<unsigned char>(arRest[lByte]);
        }
        if (lLength == 0 || lLength > scMaxFrame) {
            arRest.clear();
            break;
        }
        if (arRest.size() - 4 < lLength) {
            break;
        }
        lFrames.push_back(arRest.substr(4, lLength));
        arRest.erase(0, 4 + lLength);
    }
    return lFrames;
}

static std::string sTextOf(const ZTCBuffer& acrBuffer) {
    return {reinterpret_cast<const char*>(acrBuffer.getData()), acrBuffer.getSize()};
}

static std::vector<std::string> sAssemble(ZTCFrameAssembler& arAssembler, ZTCPiece aPiece) {
    std::vector<std::string> lFrames;
    while (!aPiece.empty()) {
        const std::size_t lCount = std::min<std::size_t>(arAssembler.getWanted(), aPiece.size());
        ZT_FUZZ_REQUIRE(lCount > 0, "nothing is wanted");
        std::memcpy(arAssembler.getSpace(), aPiece.data(), lCount);
        arAssembler.commit(static_cast<Size>(lCount));
        aPiece = aPiece.subspan(lCount);
        ZT_FUZZ_REQUIRE(arAssembler.getHad() <= arAssembler.getTotal(), std::to_string(arAssembler.getHad()));
        if (arAssembler.getState() == ZTFS_Complete) {
            lFrames.push_back(sTextOf(*arAssembler.take()));
        } else if (arAssembler.getState() == ZTFS_BadLength) {
            arAssembler.reset();
            break;
        }
    }
    return lFrames;
}

/// The agent's end of a FIFO, and the sensor's.
struct ZTSPipe {
    ZTSPipe()
        : mReader(ZTCString((getFuzzDirectory() + "/frames.fifo").c_str()), ZTFM_Read, ZTNPS_NonBlock, ZTCM_Server) {
        mReader.create();
        mReader.open();
        mSensor = ::open(mReader.getPath().get(), O_WRONLY | O_CLOEXEC);
        ZT_FUZZ_REQUIRE(mSensor >= 0, mReader.getPath().get());
    }

    std::vector<std::string> send(ZTCPiece aPiece) {
        const ssize_t lWritten = ::write(mSensor, aPiece.data(), aPiece.size());
        ZT_FUZZ_REQUIRE(lWritten == static_cast<ssize_t>(aPiece.size()), std::to_string(lWritten));
        std::vector<std::string> lFrames;
        try {
            while (true) {
                mReader.waitForActivity(std::chrono::milliseconds(0));
                ZTCPointer<ZTCBuffer> lFrame;
                unsigned lCount = 0;
                mReader.read(lFrame, lCount);
                lFrames.push_back(sTextOf(*lFrame));
            }
        } catch (const ZTCTimeOutEx&) {
            return lFrames;
        }
    }

    ZTCNamedPipe mReader;
    int mSensor = -1;
};

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize);
int LLVMFuzzerTestOneInput(const std::uint8_t* apData, std::size_t aSize) {
    discardLog(gcWholeLog);
    static ZTSPipe& srPipe = *new ZTSPipe;
    ZTCFuzzInput lInput(apData, aSize);
    std::vector<std::size_t> lLengths(lInput.takeByte());
    for (std::size_t& lrLength : lLengths) {
        lrLength = lInput.takeShort();
    }
    lLengths.push_back(scPipeRoom);

    ZTCFrameAssembler lAssembler;
    std::string lRest;
    for (std::size_t lPiece = 0; !lInput.isAtEnd(); lPiece = std::min(lPiece + 1, lLengths.size() - 1)) {
        const ZTCPiece lBytes = lInput.take(lLengths[lPiece]);
        const std::string lText(lBytes.begin(), lBytes.end());
        lRest += lText;
        const std::vector<std::string> lExpected = sFramesIn(lRest);
        ZT_FUZZ_REQUIRE(sAssemble(lAssembler, lBytes) == lExpected, "the assembler's frames are others");
        ZT_FUZZ_REQUIRE(lAssembler.getHad() == lRest.size(), std::to_string(lAssembler.getHad()));

        std::string lAlone = lText;
        ZT_FUZZ_REQUIRE(srPipe.send(lBytes) == sFramesIn(lAlone), "the pipe's frames are others");
    }
    return 0;
}
