#include "host/notice.h"

#include <cstdio>

namespace xtok::host {

void printNotice(const std::string& text) {
    // One fprintf per line so that lines from different threads do not mix.
    std::fprintf(stderr, "xtok-host: %s\n", text.c_str());
}

}  // namespace xtok::host
