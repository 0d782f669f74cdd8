// A shared library whose GetInterfaceFactory is data, not code: a loader
// that called it would crash.
extern "C" __attribute__((visibility("default"))) const char GetInterfaceFactory[] = "not code";
