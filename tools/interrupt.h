// Ctrl-C as a request, not a kill: the demo and "watch" end cleanly on it,
// the console drops the line being typed. SIGTERM asks the same and ends
// the console too. A second signal before the first was seen ends the
// program the ordinary way, in case something hangs, after putting the
// terminal's settings back.
#pragma once

#include <signal.h>

#include <chrono>

namespace xtok::tools {

/// SIGINT and SIGTERM set the request; system calls are interrupted by it.
void catchInterrupts();
bool interruptRequested();
/// Whether SIGTERM came: the session ends, whatever it was doing.
bool terminationRequested();
/// Takes the request back: true when there was one.
bool takeInterrupt();
/// Waits `pause`, or less when an interrupt comes; true when one came.
bool pauseUnlessInterrupted(std::chrono::milliseconds pause);

/// Threads started while one of these lives do not take SIGINT and SIGTERM,
/// so the signals reach the main thread and interrupt what it waits on.
class InterruptsBlocked {
public:
    InterruptsBlocked();
    ~InterruptsBlocked();
    InterruptsBlocked(const InterruptsBlocked&) = delete;
    InterruptsBlocked& operator=(const InterruptsBlocked&) = delete;

private:
    sigset_t previous_;
};

}  // namespace xtok::tools
