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

/// The source a session fills from its settings model after each change,
/// for the receive task's thread to read.
class FramingState {
public:
    /// Waits (up to two seconds) for the first set(): the receive task may
    /// begin before the session knows what is in force.
    ActiveFraming get() const;
    void set(const ActiveFraming& framing);

private:
    mutable std::mutex mutex_;
    mutable std::condition_variable known_;
    bool set_ = false;
    ActiveFraming framing_;
};

}  // namespace xtok::tools
