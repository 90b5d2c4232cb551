/// An adapters' library that needs a function that is nowhere, and calls it only when it is used.
#include <cstdint>

extern "C" {
std::uint32_t functionThatIsNowhere();
__attribute__((visibility("default"))) std::uint32_t KPM_GetFunctionList(std::uint32_t, const void**);

std::uint32_t KPM_GetFunctionList(std::uint32_t, const void**) {
    return functionThatIsNowhere();
}
}
