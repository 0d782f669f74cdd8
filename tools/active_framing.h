// The receive framing and queue limit in force, as xtok-host knows them: what
// the line monitor needs to follow the plug-in's framing from outside.
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <mutex>
#include <string>

#include "tools/token_framer.h"

namespace xtok::tools {

struct ActiveFraming {
    RxFraming rx;
    int32_t queueLimit = 100;
};

/// Asked on the receive task's thread with the port's lock held: it answers
/// from what the host knows and never asks the plug-in.
using FramingSource = std::function<ActiveFraming()>;

/// The source a session fills: the values read after the start (the
/// configuration with the retained values over it) and after each SP_Done,
/// and the console's setters as they pass.
class FramingState {
public:
    /// Waits (up to two seconds) for the first set(): the receive task may
    /// begin before the session has read what is in force.
    ActiveFraming get() const;
    void set(const ActiveFraming& framing);
    /// A line the plug-in's console accepted: set_rxPrefix, set_rxSuffix and
    /// set_rxGap change the framing at once.
    void noteCommand(const std::string& line);

private:
    mutable std::mutex mutex_;
    mutable std::condition_variable known_;
    bool set_ = false;
    ActiveFraming framing_;
};

}  // namespace xtok::tools
