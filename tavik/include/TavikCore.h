/// The callbacks through which the adapters' library delivers events, and what becomes of an event behind them.
#ifndef TAVIK_INCLUDE_TAVIKCORE_H
#define TAVIK_INCLUDE_TAVIKCORE_H

#include "libkpm/include/libkpm.h"
#include "sensor/agentcommon/include/CallbackEventData.h"

/// The pairs under which the events of the library's own callbacks are collected. They are registered under others.
inline constexpr unsigned int gcRscnCategory = 1;
inline constexpr unsigned int gcRscnSubcategory = 0x20;
inline constexpr unsigned int gcLinkCategory = 8;
inline constexpr unsigned int gcLinkSubcategory = 0x02;
inline constexpr unsigned int gcTemperatureCategory = 8;
inline constexpr unsigned int gcTemperatureSubcategory = 0x04;

/// The callbacks run on the library's threads, several at once. They take what they need before they return, hold
/// nothing of the library's, and let no exception out. They drop the event, with a notice, while collection is off,
/// while the bytes held have reached their limit, and where the board is not known.
void ScopeCb_Generic(unsigned int aBoardId, HBA_wwn aWwn, unsigned int aCategory, unsigned int aSubcategory,
                     void* apContext, ZT_event* apEvent);
void ScopeCb_KpmTemp(unsigned int aBoardId, unsigned int aFirst, unsigned int aSecond);
void ScopeCb_KpmLink(unsigned int aBoardId, void* apLinkInfo);

/// The payload's own length field is trusted: the library delivers an RSCN whole.
void ScopeCb_KpmRscn(unsigned int aBoardId, void* apData, unsigned int aLength);

#endif
