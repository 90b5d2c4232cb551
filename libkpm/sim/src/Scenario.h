/// What a scenario holds, and the reader of its text: a pure function from text to values, without files, clocks or
/// threads.
///
/// The format is line based and described in docs/simulated-library.md. A text that does not parse is refused whole,
/// with the number of the line and a reason that names the word, the limit and the value.
#ifndef LIBKPM_SIM_SRC_SCENARIO_H
#define LIBKPM_SIM_SRC_SCENARIO_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "libkpm/include/libkpm.h"
#include "libkpm/sim/src/KindTable.h"

inline constexpr std::size_t gcSimMaxTextSize = 4'194'304;         ///< bytes of a scenario
inline constexpr std::size_t gcSimMaxLineSize = 262'144;           ///< bytes of a line
inline constexpr std::uint64_t gcSimMaxMilliseconds = 86'400'000;  ///< a day
inline constexpr std::uint64_t gcSimMaxTimes = 1'000'000'000;
inline constexpr std::uint64_t gcSimMaxThreads = 64;        ///< of one line
inline constexpr std::uint64_t gcSimMaxTotalThreads = 256;  ///< of a scenario
inline constexpr std::size_t gcSimMaxAdapters = 256;
inline constexpr std::size_t gcSimMaxPorts = 4096;
inline constexpr std::size_t gcSimMaxEventLines = 4096;  ///< event, storm, state and loss lines
inline constexpr std::size_t gcSimMaxListSize = 4096;    ///< values of a list
inline constexpr std::uint64_t gcSimMaxDataSize = 65536;
inline constexpr std::size_t gcSimMaxTextValue = 1024;  ///< bytes of a reason, and of the name of a loss

/// A text that was refused. getLine() counts from 1; 0 where no line is to blame.
class ZTCSimRefusal : public std::runtime_error {
public:
    ZTCSimRefusal(std::size_t aLine, const std::string& acrReason) : std::runtime_error(acrReason), mLine(aLine) {}

    std::size_t getLine() const noexcept { return mLine; }

private:
    std::size_t mLine;
};

/// A local adapter port or a remote port.
struct ZTSSimPort {
    std::string mName;
    HBA_wwn mWwpn{};
    HBA_wwn mWwnn{};
    std::uint32_t mFcId = 0;
};

/// The values of one field; occurrence i takes value i modulo their number. Each value has the bytes that stand in the
/// event.
struct ZTSSimSetting {
    const ZTSSimField* mpField = nullptr;
    std::vector<std::vector<std::uint8_t>> mValues;
};

/// Several boards: those of the list, or all.
struct ZTSSimBoards {
    bool mAll = false;
    std::vector<std::uint32_t> mBoards;
};

/// A line that delivers events of one kind.
struct ZTSSimEvent {
    std::size_t mKind = 0;
    ZTSSimBoards mBoards;              ///< every occurrence is delivered to each of them
    std::optional<std::uint32_t> mAs;  ///< board number that the callback gets instead
    std::uint64_t mAt = 0;             ///< ms after the schedule's start
    std::uint64_t mEvery = 0;          ///< ms between two occurrences
    std::uint64_t mTimes = 1;          ///< occurrences; 0: without end
    std::uint64_t mThreads = 1;        ///< threads that share the occurrences
    bool mIsTimed = false;             ///< the line says when
    std::vector<ZTSSimPort> mPorts;    ///< remote ports, one after the other; never empty
    std::vector<ZTSSimSetting> mSettings;
    std::optional<std::vector<std::uint32_t>> mPages;  ///< RSCN page words; unset: one, the remote port's FC id
    std::optional<std::uint32_t> mCategory;            ///< the category that the scope callback gets instead
    std::optional<std::uint32_t> mSubcategory;         ///< the subcategory
    std::optional<HBA_wwn> mLocal;                     ///< the local port
    std::optional<std::vector<std::uint8_t>> mData;    ///< the data themselves, instead of fields
    bool mDataNull = false;                            ///< the payload object's data pointer is null
    bool mPayloadNull = false;                         ///< the event has no payload object
    std::optional<std::uint32_t> mLength;              ///< bytes of data, filled up with zeros or cut
    std::optional<std::uint64_t> mSize;                ///< the value of zt_evt_size
};

/// A line that delivers a random mix, the same for the same seed however many threads deliver it.
struct ZTSSimStorm {
    std::uint64_t mCount = 0;
    std::uint64_t mSeed = 1;
    std::uint64_t mAt = 0;
    std::uint64_t mOver = 0;  ///< ms over which the events are spread evenly
    std::uint64_t mThreads = 4;
    bool mIsTimed = false;
    std::vector<std::size_t> mKinds;
    std::vector<std::uint32_t> mBoards;
    std::vector<ZTSSimPort> mPorts;
    std::vector<std::uint32_t> mLuns;
};

/// A line that says what state a kind is in on some boards, and why.
struct ZTSSimState {
    std::optional<std::size_t> mKind;  ///< none: all kinds
    ZTSSimBoards mBoards;
    std::uint32_t mState = KPM_STATE_WORKING;  ///< KPM_STATE_...
    std::string mReason;
    std::uint64_t mAt = 0;  ///< ms after the schedule's start
    bool mIsTimed = false;  ///< false: from Init on
};

/// A line that loses things under a name.
struct ZTSSimLoss {
    std::string mName;
    std::uint64_t mCount = 0;  ///< lost at each occurrence
    std::uint64_t mAt = 0;     ///< ms after the schedule's start
    std::uint64_t mEvery = 0;  ///< ms between two occurrences
    std::uint64_t mTimes = 1;  ///< occurrences; 0: without end
    bool mIsTimed = false;     ///< the line says when
};

enum ZTESimOperation : std::uint8_t { ZTSO_GetAdapterInfo, ZTSO_Register, ZTSO_Unregister };

/// What the library answers instead of doing what it is asked.
struct ZTSSimAnswer {
    ZTESimOperation mOperation = ZTSO_Register;
    std::optional<std::size_t> mKind;     ///< none: all kinds
    std::optional<std::uint32_t> mBoard;  ///< none: all boards
    std::uint32_t mStatus = 0;
    std::optional<std::uint32_t> mHandle;
    std::uint64_t mTimes = 0;  ///< calls that are answered so; 0: all
};

struct ZTSSimCountChange {
    std::uint64_t mAt = 0;
    std::uint32_t mCount = 0;
};

/// What starts the schedule's clock.
enum ZTESimStart : std::uint8_t {
    ZTSS_Registered,  ///< adapter-arrival, the last kind, is registered on the last board
    ZTSS_First,       ///< the first registration
    ZTSS_Init         ///< Init
};

struct ZTSSimScenario {
    std::uint32_t mInitStatus = 0;
    bool mIsZtapiSupported = true;
    bool mHasOddAddresses = true;
    ZTESimStart mStart = ZTSS_Registered;
    std::optional<std::uint32_t> mCount;  ///< boards at first; none: all
    std::vector<ZTSSimPort> mAdapters;    ///< by board number
    std::vector<ZTSSimPort> mPorts;
    std::vector<ZTSSimAnswer> mAnswers;
    std::vector<ZTSSimCountChange> mCountChanges;
    std::vector<ZTSSimEvent> mEvents;
    std::vector<ZTSSimStorm> mStorms;
    std::vector<ZTSSimState> mStates;
    std::vector<ZTSSimLoss> mLosses;
    std::uint64_t mThreads = 0;  ///< threads that the lines ask for
};

/// A line that makes something happen: in a scenario at its time, injected at once.
using ZTSSimEventLine = std::variant<ZTSSimEvent, ZTSSimStorm, ZTSSimState, ZTSSimLoss>;

/// Reads a whole scenario. Throws ZTCSimRefusal.
ZTSSimScenario parseSimScenario(std::string_view aText);

/// Reads one event, storm, state or loss line that uses the adapters and ports of `acrScenario`. Throws ZTCSimRefusal,
/// also for every other directive; its line number is 0.
ZTSSimEventLine parseSimEventLine(std::string_view aLine, const ZTSSimScenario& acrScenario);

/// The scenario that is played where none is named: two adapters, four remote ports, no events.
std::string_view getDefaultSimScenario();

#endif
