/// The receiving end of a FIFO that this process makes and removes.

#ifndef OS_COMMON_INCLUDE_NAMEDPIPEREADERSERVER_H
#define OS_COMMON_INCLUDE_NAMEDPIPEREADERSERVER_H

#include "common/include/Pointer.h"
#include "os/common/include/NamedPipe.h"
#include "os/common/include/Reader.h"
#include "os/common/include/Server.h"

/// Forwards every operation to its pipe, whose header says what they do.
class ZTCNamedPipeReaderServer : public ZTCReader, public ZTCServer {
public:
    ZTCNamedPipeReaderServer(const ZTCString& acrPath, ZTEPipeState aPipeState);

    void read(ZTCPointer<ZTCBuffer>& arBuffer, unsigned& arCount) override;
    void waitForActivity(unsigned aSeconds) override;
    void open() override;
    void close() override;
    void create() override;
    void destroy() override;
    void accept() override;

private:
    ZTCPointer<ZTCNamedPipe> mNamedPipe;  // empty where memory ran out; then every operation is fatal
};

#endif
