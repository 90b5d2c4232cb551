/// What the sensor's side throws. Every text is one line that names who, what, which limit and which value.
#ifndef SENSOR_CLIENT_INCLUDE_CLIENTERRORS_H
#define SENSOR_CLIENT_INCLUDE_CLIENTERRORS_H

#include <cstddef>
#include <stdexcept>
#include <string>

/// Base of the family.
class ZTCClientEx : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// A text or value that the caller gave cannot be used.
class ZTCBadInputEx : public ZTCClientEx {
public:
    using ZTCClientEx::ZTCClientEx;
};

/// Bytes that are not a response. Carries the offset of the field that could not be read.
class ZTCDecodeEx : public ZTCClientEx {
public:
    ZTCDecodeEx(std::size_t aOffset, const std::string& acrText) : ZTCClientEx(acrText), mOffset(aOffset) {}

    std::size_t getOffset() const { return mOffset; }

private:
    std::size_t mOffset;
};

/// Why there is no answer.
enum ZTENoAnswerReason {
    ZTNA_NoFifo,         ///< a FIFO is missing: no agent has been started in this directory, or it has ended in order
    ZTNA_NobodyListens,  ///< the FIFOs are there, but no agent reads commands
    ZTNA_LockHeld,       ///< another client held the lock all the time
    ZTNA_AgentDied,      ///< the agent ended during the conversation
    ZTNA_Silence         ///< the agent is there, and did not take the request or finish its answer in time
};

/// An expected outcome of talking to another process, not a defect: no agent, or no answer in time.
class ZTCNoAnswerEx : public ZTCClientEx {
public:
    ZTCNoAnswerEx(ZTENoAnswerReason aReason, const std::string& acrText) : ZTCClientEx(acrText), mReason(aReason) {}

    ZTENoAnswerReason getReason() const { return mReason; }

private:
    ZTENoAnswerReason mReason;
};

/// The caller's cancel descriptor became readable before a request was sent.
class ZTCCancelledEx : public ZTCClientEx {
public:
    using ZTCClientEx::ZTCClientEx;
};

/// Another live process plays the sensor in this directory.
class ZTCSensorBusyEx : public ZTCClientEx {
public:
    using ZTCClientEx::ZTCClientEx;
};

/// The operating system refused a call. The text names the call's purpose, its object and the system's reason.
class ZTCSystemCallEx : public ZTCClientEx {
public:
    ZTCSystemCallEx(const std::string& acrWhat, int aErrno);

    int getErrno() const { return mErrno; }

private:
    int mErrno;
};

/// Whether a call failed for lack of descriptors or memory. That says nothing about the call's object, and may pass.
bool isShortage(int aErrno);

#endif
