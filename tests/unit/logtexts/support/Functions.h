/// The functions that a source defines, and whether each traces its beginning and its ends, read out of the text.
#ifndef TESTS_UNIT_LOGTEXTS_SUPPORT_FUNCTIONS_H
#define TESTS_UNIT_LOGTEXTS_SUPPORT_FUNCTIONS_H

#include <string>
#include <vector>

struct ZTSFunction {
    std::string mName;  ///< with its class: "ZTCTavikSystem::preInit"
    std::string mBody;  ///< between its braces, without comments, texts in quotes and the bodies of lambdas
};

/// The definitions of a source, in order. Functions that run at compile time and lambdas are left out.
std::vector<ZTSFunction> readFunctions(const std::string& acrSource);

/// Whether the function's first statement logs "Entered".
bool isTraced(const ZTSFunction& acrFunction);

/// Why a traced function does not log "Left" on every path out of it; empty where it does. A path that an exception of
/// a called function takes does not count.
std::string findUntracedExit(const ZTSFunction& acrFunction);

#endif
