/// The lines of a scenario that make something happen: events of one kind, a storm of many kinds, a state, a loss.
#ifndef LIBKPM_SIM_SRC_SCENARIOEVENTS_H
#define LIBKPM_SIM_SRC_SCENARIOEVENTS_H

#include <cstddef>

#include "libkpm/sim/src/Scenario.h"
#include "libkpm/sim/src/ScenarioLine.h"

/// Reads the rest of a line that begins with the kind's name. Throws ZTCSimRefusal.
ZTSSimEvent parseSimEvent(ZTCSimLine& arLine, std::size_t aKind, const ZTSSimScenario& acrScenario);

/// Reads the rest of a line that begins with `storm`. Throws ZTCSimRefusal.
ZTSSimStorm parseSimStorm(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario);

/// Reads the rest of a line that begins with `state`. Throws ZTCSimRefusal.
ZTSSimState parseSimState(ZTCSimLine& arLine, const ZTSSimScenario& acrScenario);

/// Reads the rest of a line that begins with `loss`. Throws ZTCSimRefusal.
ZTSSimLoss parseSimLoss(ZTCSimLine& arLine);

#endif
