/// A module that loads and offers something, but not the one symbol of an adapters' library.
extern "C" __attribute__((visibility("default"))) int moduleWithoutEntry();
int moduleWithoutEntry() {
    return 0;
}
