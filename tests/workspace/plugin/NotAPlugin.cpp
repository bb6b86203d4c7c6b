// A shared object without the plug-in entry symbols.
extern "C" __attribute__((visibility("default"))) int chirrup_something_else(void) {
    return 1;
}
