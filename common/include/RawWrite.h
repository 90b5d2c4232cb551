/// Writes bytes without using any other part of the framework. For the log, which all other parts use.

#ifndef COMMON_INCLUDE_RAWWRITE_H
#define COMMON_INCLUDE_RAWWRITE_H

#include <cstddef>

/// Writes all bytes, waiting where the descriptor waits. Returns 0 or the error number; arWritten counts what was
/// written either way.
int writeAll(int aDescriptor, const char* apBytes, std::size_t aCount, std::size_t& arWritten) noexcept;

/// Writes to standard error what finds room there at once, and drops the rest: a standard error that nobody reads
/// delays no thread. A reader that has gone is no error: the process goes on.
void writeToStandardError(const char* apBytes, std::size_t aCount) noexcept;

#endif
