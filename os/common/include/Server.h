/// The side of a channel that makes it and removes it.

#ifndef OS_COMMON_INCLUDE_SERVER_H
#define OS_COMMON_INCLUDE_SERVER_H

class ZTCServer {
public:
    ZTCServer() = default;
    virtual ~ZTCServer() = default;

    ZTCServer(const ZTCServer&) = delete;
    ZTCServer& operator=(const ZTCServer&) = delete;

    virtual void open() = 0;
    virtual void close() = 0;
    virtual void create() = 0;
    virtual void destroy() = 0;
    virtual void accept() = 0;
};

#endif
