/// The requests to a running engine: one line of text each, with one line as the answer.
///
///   status                    ok delivered=N dropped=N pages=N registered=N adapters=N schedule=waiting|running|done
///   counts                    ok KIND=N ...: delivered events of each kind
///   an event or storm line    ok N: it is delivered now, in N callbacks
///
/// Whatever is refused is answered with `error: ` and a reason.
#ifndef LIBKPM_SIM_SRC_CONTROL_H
#define LIBKPM_SIM_SRC_CONTROL_H

#include <string>
#include <string_view>

class ZTCSimEngine;

/// Answers one line, without line breaks on either side. Throws only std::bad_alloc.
std::string answerSimLine(ZTCSimEngine& arEngine, std::string_view aLine);

#endif
