// A terminal's settings as text, so that a test compares them field by field
// and a failure shows which differ.
#pragma once

#include <termios.h>

#include <cstdio>
#include <string>

namespace xtok::host::test {

inline std::string settingsText(const termios& t) {
    char text[128];
    std::snprintf(text, sizeof text, "iflag %o oflag %o cflag %o lflag %o speed %u/%u cc",
                  t.c_iflag, t.c_oflag, t.c_cflag, t.c_lflag, cfgetispeed(&t), cfgetospeed(&t));
    std::string shown = text;
    for (cc_t c : t.c_cc) {
        shown += " " + std::to_string(c);
    }
    return shown;
}

}  // namespace xtok::host::test
