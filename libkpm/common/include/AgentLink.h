/// Reports from the library to the agent: lines for the agent's log, the state of each source, and the totals of
/// losses. Each goes through a function that the agent hands over before Init. Without that function it is dropped.
///
/// All functions may be called from any thread, but never with a lock held that an entry of the library takes.
#ifndef LIBKPM_COMMON_INCLUDE_AGENTLINK_H
#define LIBKPM_COMMON_INCLUDE_AGENTLINK_H

#include <cstdint>
#include <string>

#include "libkpm/include/libkpm.h"

/// Null: lines are dropped.
void setLibraryLog(KPM_LogFunction apLog) noexcept;

/// Writes one line, at a level of libkpm.h.
void logLibraryLine(std::uint32_t aLevel, const std::string& acrText) noexcept;

/// Null functions: nothing is reported. Called before Init, and with null functions once no thread of the library runs.
void setLibraryReport(void* apContext, KPM_StateFunction apState, KPM_LossFunction apLoss) noexcept;

/// Reports the state (KPM_STATE_...) of one kind on one board, and why it is so. Category and subcategory are those
/// that the kind is delivered as.
void reportLibraryState(std::uint32_t aBoard, std::uint32_t aCategory, std::uint32_t aSubcategory, std::uint32_t aState,
                        const std::string& acrReason) noexcept;

/// Reports how much was lost since Init, under one of the library's fixed names.
void reportLibraryLoss(const char* apName, std::uint64_t aTotal) noexcept;

#endif
