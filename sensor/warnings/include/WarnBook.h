/// Decides when to warn. Knows the rules, what has happened, what holds, and which warnings were given; starts nothing
/// itself.
///
/// A trouble is what one rule sees of one port, initiator or host. It opens when as much happened within the rule's
/// time as the rule asks for. It is over when nothing of it happened within that time and nothing of it holds. While it
/// is open it is warned of again after a pause that begins with a minute, or with the rule's time where that is longer,
/// and doubles up to a day. The next trouble after its end begins anew.
///
/// One thread. Times are the wall clock's, since they outlive a restart.
#ifndef SENSOR_WARNINGS_INCLUDE_WARNBOOK_H
#define SENSOR_WARNINGS_INCLUDE_WARNBOOK_H

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "sensor/settings/include/Settings.h"
#include "sensor/store/include/Episode.h"
#include "sensor/warnings/include/WarnWindow.h"

inline constexpr std::chrono::seconds gcFirstWarnPause{60};
inline constexpr std::chrono::hours gcLongestWarnPause{24};
/// Troubles that are open at once; of more a line is reported, and nobody is warned.
inline constexpr std::size_t gcMostWarnings = 256;

/// Something that a rule can count.
struct ZTSWarnOccurrence {
    std::string mKind;  ///< as in a rule
    ZTSInitiator mInitiator;
    std::optional<ZTSRemotePort> mRemotePort;
    std::uint64_t mCount = 1;
    ZTCHistoryTime mTime;
    std::string mText;  ///< for people; empty: the kind says it all
};

/// One trouble that is open.
struct ZTSTrouble {
    std::size_t mRule = 0;    ///< place of its rule
    std::string mSubject;     ///< WWPN of the port or initiator; empty: the host
    ZTSInitiator mInitiator;  ///< of its last occurrence, as the next two
    std::optional<ZTSRemotePort> mRemotePort;
    std::string mText;
    std::uint64_t mCount = 0;     ///< within the rule's time
    ZTCHistoryTime mFirst;        ///< when it began
    ZTCHistoryTime mLast;         ///< its last occurrence
    std::uint64_t mWarnings = 0;  ///< given so far
    ZTCHistoryTime mNext;         ///< when it is warned of next, if it is not over then
};

class ZTCWarnBook {
public:
    explicit ZTCWarnBook(std::vector<ZTSWarnRule> aRules);

    const ZTSWarnRule& getRule(std::size_t aRule) const { return mRules.at(aRule); }
    const std::vector<ZTSWarnRule>& getRules() const { return mRules; }

    void note(const ZTSWarnOccurrence& acrOccurrence);
    /// The states that hold now. A state that held before and is not among them has ended. A new one counts as an
    /// occurrence.
    void setHolding(const std::vector<ZTSWarnOccurrence>& acrHolding);

    /// Opens and ends troubles. Call it before the functions below. @param aIsKnown  whether it is known what happens
    /// of a kind: without that no trouble of it ends  @param arLines  gets a line for each end
    void judge(ZTCHistoryTime aNow, const std::function<bool(const std::string& acrKind)>& aIsKnown,
               std::vector<std::string>& arLines);
    /// The troubles that are to be warned of now, at most so many; each is then taken as warned of, its next time set.
    std::vector<ZTSTrouble> takeDue(ZTCHistoryTime aNow, std::size_t aMost);
    std::vector<ZTSTrouble> getOpen() const;
    /// Whether no trouble is open or counted: then time alone changes nothing.
    bool isEmpty() const { return mTracks.empty(); }

    /// The open troubles as a text that the next process, or a book with other rules, continues from.
    std::string toText() const;
    /// Rules that are no longer there lose their troubles. A text that cannot be read is skipped. Returns whether
    /// it could be read.
    bool load(const std::string& acrText);

private:
    struct ZTSTrack {
        explicit ZTSTrack(std::chrono::milliseconds aWithin) : mWindow(aWithin) {}

        ZTSTrouble mTrouble;
        ZTCWarnWindow mWindow;
        bool mIsHolding = false;
        bool mIsOpen = false;
        std::chrono::microseconds mPause{};  ///< behind the last warning
    };
    using ZTCTrackKey = std::pair<std::size_t, std::string>;

    ZTSTrack& findOrAdd(std::size_t aRule, const ZTSWarnOccurrence& acrOccurrence);
    std::string describe(const ZTSTrouble& acrTrouble) const;

    const std::vector<ZTSWarnRule> mRules;
    std::map<ZTCTrackKey, ZTSTrack> mTracks;
    std::size_t mOpen = 0;
    bool mIsOverfull = false;
};

/// The subject of an occurrence by the rule's "per".
std::string findWarnSubject(const ZTSWarnRule& acrRule, const ZTSWarnOccurrence& acrOccurrence);

#endif
