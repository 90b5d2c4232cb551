/// The standard streams of a command-line program.
#ifndef SENSOR_CLIENT_INCLUDE_STANDARDSTREAMS_H
#define SENSOR_CLIENT_INCLUDE_STANDARDSTREAMS_H

#include <cstddef>
#include <string>

/// Opens /dev/null as each of the descriptors 0 to 2 that the parent has closed, so that no other file gets one of
/// these numbers. Returns whether standard output was open.
bool reserveStandardStreams();

/// The same for a program that is of no use without standard output: throws ZTCSystemCallEx where it was closed.
void requireStandardOutput();

/// Makes one write to standard output, from the offset aWritten on, of at most so many bytes. Returns the bytes
/// written; 0 after an interruption, or where a descriptor that does not block is full. Throws ZTCSystemCallEx.
std::size_t writeSomeOutput(const std::string& acrText, std::size_t aWritten, std::size_t aMost);

/// Writes all of it to standard output, and waits where it is full. Throws ZTCSystemCallEx.
void writeOutput(const std::string& acrText);

#endif
