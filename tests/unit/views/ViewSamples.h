/// Live states, histories and episodes that the tests of the views look at. Local time is an hour before UTC's clock in
/// all of them.
#ifndef TESTS_UNIT_VIEWS_VIEWSAMPLES_H
#define TESTS_UNIT_VIEWS_VIEWSAMPLES_H

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "sensor/views/include/StatusFacts.h"
#include "tests/unit/views/SanSamples.h"

/// Sets the time zone of central Europe for the tests of a fixture.
class LocalTime : public testing::Test {
protected:
    LocalTime();
    ~LocalTime() override;
};

/// A time from its text, such as "2026-11-21T10:04:12+01:00".
ZTCHistoryTime timeOf(const std::string& acrText);

ZTSFcName wwnOf(const std::string& acrText);

/// A host with two adapters and 96 LUNs, that collects and had its last event three hours ago: the live state as JSON.
nlohmann::json makeHealthyJson();

/// The facts of that host at 2026-11-21 10:04:12: state and history.
ZTSStatusFacts makeHealthyFacts();

/// The same host, whose sensor answers with this state.
ZTSStatusFacts makeFacts(const nlohmann::json& acrLive);

/// Has this topology judged as the host's.
void setSan(ZTSStatusFacts& arFacts, const ZTSTopology& acrTopology, const ZTSSanPast& acrPast = {});

/// A closed episode of 20,000 queue-full answers on three LUNs.
ZTSEpisode makeQueueFullEpisode();

#endif
