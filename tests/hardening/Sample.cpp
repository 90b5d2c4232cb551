// A program with a buffer that a checked function fills, built with one property less each time.
#include <cstdio>
#include <cstring>

#ifdef TAVIK_TEXT_RELOCATION
// An address among the code, which the loader has to fill in.
__asm__(".text\n.balign 8\n.globl gWrittenCode\ngWrittenCode: .quad main\n");
#endif

int main(int aCount, char** apArguments) {
    char lText[64];
    std::snprintf(lText, sizeof lText, "%s", apArguments[aCount - 1]);
    char lCopy[64];
    std::strcpy(lCopy, lText);
    return std::puts(lCopy) < 0 ? 1 : 0;
}
