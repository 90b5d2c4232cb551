/// An outlet that is given every change of an episode, in the order of the history, at least once.
///
/// The history keeps a number for each outlet: the last change that it has. So an outlet that was away goes on where it
/// stopped. The history counts changes that retention removed before the outlet had them, and the outlet gets
/// their number.
#ifndef SENSOR_OUTLETS_INCLUDE_CHANGEOUTLET_H
#define SENSOR_OUTLETS_INCLUDE_CHANGEOUTLET_H

#include <cstdint>
#include <span>
#include <string>

#include "sensor/store/include/Episode.h"

struct ZTSOutletChange {
    ZTSEpisode mEpisode;  ///< with number and phase of the change
    std::string mPort;    ///< the remote port for people: its name or WWPN; empty: none
    std::string mLine;    ///< the change in JSON, without a line break
};

class ZTCChangeOutlet {
public:
    virtual ~ZTCChangeOutlet() = default;

    /// For people: "the file of JSON lines".
    virtual const char* getTitle() const = 0;
    /// In names of stored values: "ndjson".
    virtual const char* getName() const = 0;

    /// Takes all of them, or throws ZTCSystemCallEx: they are then given again.
    virtual void write(std::span<const ZTSOutletChange> aChanges) = 0;
    /// Retention has removed so many changes before they could be given. Throws as write().
    /// @param acrLine  the same in JSON, without a line break
    virtual void writeMissed(std::uint64_t aChanges, const std::string& acrLine) = 0;
};

#endif
