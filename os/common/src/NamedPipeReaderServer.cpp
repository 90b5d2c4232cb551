#include "os/common/include/NamedPipeReaderServer.h"

#include "common/include/Memory.h"

ZTCNamedPipeReaderServer::ZTCNamedPipeReaderServer(const ZTCString& acrPath, ZTEPipeState aPipeState) {
    ZTCNamedPipe* lpNamedPipe = NEW ZTCNamedPipe(acrPath, ZTFM_Read, aPipeState, ZTCM_Server);
    if (lpNamedPipe != nullptr) {
        mNamedPipe = ZTCPointer<ZTCNamedPipe>(lpNamedPipe);
    }
}

void ZTCNamedPipeReaderServer::read(ZTCPointer<ZTCBuffer>& arBuffer, unsigned& arCount) {
    mNamedPipe->read(arBuffer, arCount);
}

void ZTCNamedPipeReaderServer::waitForActivity(unsigned aSeconds) {
    mNamedPipe->waitForActivity(aSeconds);
}

void ZTCNamedPipeReaderServer::open() {
    mNamedPipe->open();
}

void ZTCNamedPipeReaderServer::close() {
    mNamedPipe->close();
}

void ZTCNamedPipeReaderServer::create() {
    mNamedPipe->create();
}

void ZTCNamedPipeReaderServer::destroy() {
    mNamedPipe->destroy();
}

void ZTCNamedPipeReaderServer::accept() {
    mNamedPipe->accept();
}
