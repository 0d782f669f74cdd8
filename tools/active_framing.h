// The receive framing and queue limit in force, as xtok-host knows them: what
// the line monitor needs to follow the plug-in's framing from outside.
#pragma once

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

/// The source a session fills from its settings model, before the start and
/// after each change, for the receive task's thread to read.
class FramingState {
public:
    ActiveFraming get() const;
    void set(const ActiveFraming& framing);

private:
    mutable std::mutex mutex_;
    ActiveFraming framing_;
};

}  // namespace xtok::tools
