/// The sending end of a FIFO that this process makes and removes.

#ifndef OS_COMMON_INCLUDE_NAMEDPIPEWRITERSERVER_H
#define OS_COMMON_INCLUDE_NAMEDPIPEWRITERSERVER_H

#include "common/include/Pointer.h"
#include "os/common/include/NamedPipe.h"
#include "os/common/include/Server.h"
#include "os/common/include/Writer.h"

/// Forwards every operation to its pipe, whose header says what they do.
class ZTCNamedPipeWriterServer : public ZTCWriter, public ZTCServer {
public:
    ZTCNamedPipeWriterServer(const ZTCString& acrPath, ZTEPipeState aPipeState);

    void write(const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned& arCount) override;
    void open() override;
    void close() override;
    void create() override;
    void destroy() override;
    void accept() override;

private:
    ZTCPointer<ZTCNamedPipe> mNamedPipe;  // empty where memory ran out; then every operation is fatal
};

#endif
