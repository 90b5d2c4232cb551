/// World wide names: compares them, prints them, and recognizes the empty name. Pure.
#ifndef LIBKPM_COMMON_INCLUDE_PORTNAME_H
#define LIBKPM_COMMON_INCLUDE_PORTNAME_H

#include <string>

#include "libkpm/include/libkpm.h"

bool isSameName(const HBA_wwn& acrOne, const HBA_wwn& acrOther);

/// All bytes are zero.
bool isZeroName(const HBA_wwn& acrName);

/// False for all zeros and for all ones, which the FC transport class shows until the driver has set the name.
bool isName(const HBA_wwn& acrName);

/// "10:00:00:00:00:00:00:0b"
std::string formatName(const HBA_wwn& acrName);

#endif
