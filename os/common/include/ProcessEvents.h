/// Events of the whole process that a thread can wait for together with descriptors.

#ifndef OS_COMMON_INCLUDE_PROCESSEVENTS_H
#define OS_COMMON_INCLUDE_PROCESSEVENTS_H

/// Raised once, stays raised. All operations may be called from any thread at once.
class ZTCProcessEvent {
public:
    /// Throws ZTCClibEventFailedEx where no descriptor can be had.
    ZTCProcessEvent();
    ~ZTCProcessEvent();

    ZTCProcessEvent(const ZTCProcessEvent&) = delete;
    ZTCProcessEvent& operator=(const ZTCProcessEvent&) = delete;

    void raise() noexcept;
    bool isRaised() const;

    /// Readable while the event is raised. It belongs to the event: a poller neither reads nor closes it.
    int getDescriptor() const { return mDescriptor; }

    /// Waits until the event is raised (true) or the time has passed (false); a negative time never ends.
    bool waitFor(int aMilliseconds) const;

    /// Takes the event back. The events of the process are only taken back by tests.
    void reset() noexcept;

private:
    const int mDescriptor;
};

// Each is made at its first use. That throws ZTCClibEventFailedEx where no descriptor can be had. So the driver uses
// both before there is a thread.

/// Somebody outside asked the process to stop (SIGTERM, SIGINT).
ZTCProcessEvent& getStopEvent();

/// The threads are to exit: every thread component is marked by the time this is raised.
ZTCProcessEvent& getExitEvent();

#endif
