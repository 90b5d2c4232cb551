/// What a call throws, as text.
#ifndef TESTS_SUPPORT_THROWNTEXT_H
#define TESTS_SUPPORT_THROWNTEXT_H

#include <functional>
#include <string>

/// The text of the exception of this class that the call throws.
template <typename Exception>
std::string thrownText(const std::function<void()>& acrCall) {
    try {
        acrCall();
    } catch (const Exception& acrException) {
        return acrException.what();
    }
    return "nothing was thrown";
}

#endif
