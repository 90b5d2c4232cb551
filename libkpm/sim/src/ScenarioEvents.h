/// The two lines of a scenario that deliver events: one kind of event, and a storm of many.
#ifndef LIBKPM_SIM_SRC_SCENARIOEVENTS_H
#define LIBKPM_SIM_SRC_SCENARIOEVENTS_H

#include <cstddef>

#include "libkpm/sim/src/Scenario.h"
#include "libkpm/sim/src/ScenarioLine.h"

/// Reads the rest of a line that begins with the kind's name. Throws ZTCSimRefusal.
ZTSSimEvent parseSimEvent(ZTCSimLine& arLine, std::size_t aKind, const ZTSSimScenario& acrScenario);

/// Reads the rest of a line that begins with `storm`. Throws ZTCSimRefusal.
ZTSSimStorm parseSimStorm(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario);

#endif
