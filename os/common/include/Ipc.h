/// A means of communication between processes.

#ifndef OS_COMMON_INCLUDE_IPC_H
#define OS_COMMON_INCLUDE_IPC_H

class ZTCIpc {
public:
    ZTCIpc() = default;
    virtual ~ZTCIpc() = default;

    ZTCIpc(const ZTCIpc&) = delete;
    ZTCIpc& operator=(const ZTCIpc&) = delete;

    virtual void open() = 0;
    virtual void close() = 0;
    virtual void create() = 0;
    virtual void destroy() = 0;
    virtual void accept() = 0;
};

#endif
