// The library's one exported symbol.
#include "module/interface_factory.h"

#if defined(_WIN32)
#define XTOK_EXPORT __declspec(dllexport)
#else
#define XTOK_EXPORT __attribute__((visibility("default")))
#endif

extern "C" XTOK_EXPORT void* GetInterfaceFactory(void) {
    return static_cast<xtok::IInterfaceFactory*>(&xtok::rootObject());
}
