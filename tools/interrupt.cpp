#include "tools/interrupt.h"

#include <pthread.h>
#include <signal.h>
#include <time.h>

#include <cerrno>

#include "tools/terminal_state.h"

namespace xtok::tools {

namespace {

volatile sig_atomic_t requested = 0;
volatile sig_atomic_t terminating = 0;

void onSignal(int number) {
    if (requested) {
        restoreTerminalSettings();
        signal(number, SIG_DFL);
        raise(number);
        return;
    }
    requested = 1;
    terminating = terminating || number == SIGTERM;
}

}  // namespace

void catchInterrupts() {
    struct sigaction action {};
    action.sa_handler = onSignal;
    sigemptyset(&action.sa_mask);
    action.sa_flags = 0;  // no SA_RESTART: a blocked read or poll returns EINTR
    sigaction(SIGINT, &action, nullptr);
    sigaction(SIGTERM, &action, nullptr);
}

bool interruptRequested() {
    return requested != 0;
}

bool terminationRequested() {
    return terminating != 0;
}

bool takeInterrupt() {
    bool was = requested != 0;
    requested = 0;
    return was;
}

bool pauseUnlessInterrupted(std::chrono::milliseconds pause) {
    timespec left{static_cast<time_t>(pause.count() / 1000),
                  static_cast<long>(pause.count() % 1000) * 1000000L};
    while (!requested && nanosleep(&left, &left) != 0 && errno == EINTR) {
    }
    return requested != 0;
}

InterruptsBlocked::InterruptsBlocked() {
    sigset_t blocked;
    sigemptyset(&blocked);
    sigaddset(&blocked, SIGINT);
    sigaddset(&blocked, SIGTERM);
    pthread_sigmask(SIG_BLOCK, &blocked, &previous_);
}

InterruptsBlocked::~InterruptsBlocked() {
    pthread_sigmask(SIG_SETMASK, &previous_, nullptr);
}

}  // namespace xtok::tools
