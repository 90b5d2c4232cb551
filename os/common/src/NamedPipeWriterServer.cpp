#include "os/common/include/NamedPipeWriterServer.h"

#include "common/include/Memory.h"

ZTCNamedPipeWriterServer::ZTCNamedPipeWriterServer(const ZTCString& acrPath, ZTEPipeState aPipeState) {
    ZTCNamedPipe* lpNamedPipe = NEW ZTCNamedPipe(acrPath, ZTFM_Write, aPipeState, ZTCM_Server);
    if (lpNamedPipe != nullptr) {
        mNamedPipe = ZTCPointer<ZTCNamedPipe>(lpNamedPipe);
    }
}

void ZTCNamedPipeWriterServer::write(const ZTCPointer<ZTCBuffer>& acrBuffer, unsigned& arCount) {
    mNamedPipe->write(acrBuffer, arCount);
}

void ZTCNamedPipeWriterServer::open() {
    mNamedPipe->open();
}

void ZTCNamedPipeWriterServer::close() {
    mNamedPipe->close();
}

void ZTCNamedPipeWriterServer::create() {
    mNamedPipe->create();
}

void ZTCNamedPipeWriterServer::destroy() {
    mNamedPipe->destroy();
}

void ZTCNamedPipeWriterServer::accept() {
    mNamedPipe->accept();
}
