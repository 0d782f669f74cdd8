#include "tools/terminal_state.h"

#include <signal.h>
#include <termios.h>
#include <unistd.h>

#include <cstdlib>
#include <exception>

#include "host/serial_line.h"

namespace xtok::tools {

namespace {

termios kept;
volatile sig_atomic_t haveKept = 0;
std::terminate_handler previousTerminate = nullptr;

[[noreturn]] void restoreThenTerminate() {
    restoreTerminalSettings();
    if (previousTerminate) {
        previousTerminate();
    }
    std::abort();
}

}  // namespace

void keepTerminalSettings() {
    if (haveKept || !isatty(STDIN_FILENO) || tcgetattr(STDIN_FILENO, &kept) != 0) {
        return;
    }
    haveKept = 1;
    std::atexit(restoreTerminalSettings);
    previousTerminate = std::set_terminate(restoreThenTerminate);
}

void restoreTerminalSettings() {
    if (haveKept) {
        host::restoreTerminal(STDIN_FILENO, kept);
    }
}

}  // namespace xtok::tools
