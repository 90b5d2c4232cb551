/// Episodes, records and ports as JSON. The same objects are in every output. docs/tavik.md documents them.
///
/// What is not known is null. WWNs and FC addresses are texts.
#ifndef SENSOR_VIEWS_INCLUDE_EPISODEJSON_H
#define SENSOR_VIEWS_INCLUDE_EPISODEJSON_H

#include <nlohmann/json_fwd.hpp>

#include "sensor/store/include/History.h"
#include "sensor/views/include/NameBook.h"

/// {"wwpn", "wwnn", "host"}.
nlohmann::ordered_json toJson(const ZTSInitiator& acrInitiator);

/// {"wwpn", "wwnn", "fcId", "name"}, or null. Of episodes and records also "rport", the kernel's name of then.
nlohmann::ordered_json toJson(const std::optional<ZTSRemotePort>& acrPort, const ZTCNameBook& acrNames);

/// The episode, as of its latest change, in the names of the time of its first event.
nlohmann::ordered_json toJson(const ZTSEpisode& acrEpisode, const ZTCNameBook& acrNames);

/// A raw record, with its fields by name.
nlohmann::ordered_json toJson(const ZTSStoredRecord& acrRecord, const ZTCNameBook& acrNames);

/// A row of `ports`: {"remotePort", "state", "initiators", "rports", "count", "kinds", "last"}; state and rports as of
/// now.
nlohmann::ordered_json toJson(const ZTSPortSummary& acrPort, const ZTCNameBook& acrNames);

#endif
