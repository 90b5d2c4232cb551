/// The agent's functions by whether they trace, each as its file, a blank and its name.
#ifndef TESTS_UNIT_LOGTEXTS_SUPPORT_TRACEDFUNCTIONS_H
#define TESTS_UNIT_LOGTEXTS_SUPPORT_TRACEDFUNCTIONS_H

#include <string>
#include <vector>

/// Those that log "Entered" and "Left". An overload stands once for each of its forms.
const std::vector<std::string>& tracedFunctions();

/// Those that only hand out, set or look up a field, and trace nothing.
const std::vector<std::string>& accessorFunctions();

#endif
