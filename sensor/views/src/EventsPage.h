/// docs/events.md as a text, put there by the build.
#ifndef SENSOR_VIEWS_SRC_EVENTSPAGE_H
#define SENSOR_VIEWS_SRC_EVENTSPAGE_H

#include <string_view>

extern const std::string_view gcEventsPage;

#endif
