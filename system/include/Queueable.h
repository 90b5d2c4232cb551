/// What queues and lists hold.

#ifndef SYSTEM_INCLUDE_QUEUEABLE_H
#define SYSTEM_INCLUDE_QUEUEABLE_H

class ZTCQueueable {
public:
    ZTCQueueable() = default;
    virtual ~ZTCQueueable() = default;

    ZTCQueueable(const ZTCQueueable&) = delete;
    ZTCQueueable& operator=(const ZTCQueueable&) = delete;
};

#endif
