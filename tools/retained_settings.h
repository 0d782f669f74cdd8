// The settings a protocol instance retained in the state file, as xtok-host
// tells an operator about them: those a port refused, a queue size the
// project editor would not take, and what a reset cleared.
#pragma once

#include <cstdint>
#include <string>

#include "host/permanent_storage.h"
#include "xtokline/constants.h"

namespace xtok::tools {

class RetainedSettings {
public:
    RetainedSettings(host::PermanentStorage& storage, std::string instance)
        : storage_(storage), instance_(std::move(instance)) {}

    /// "in FILE for instance NAME".
    std::string where() const;
    /// The retained line settings that differ from the `configured` ones,
    /// e.g. "baud 14400 (configured 9600)"; "" when there are none.
    std::string lineDifferences(const LineSettings& configured);
    /// A warning about the retained token_queue_size, or "".
    std::string queueSizeWarning();
    /// Forgets them all; `report` says what was cleared. False with `error`.
    bool clear(std::string& report, std::string& error);

private:
    host::PermanentStorage& storage_;
    std::string instance_;
};

/// A warning when a token queue size lies outside the range the project
/// editor accepts, naming what it is and where it came from; "" when it
/// lies within.
std::string queueSizeWarning(int32_t size, const std::string& what, const std::string& where = "");

/// The port and line of a settings text as GetSerialSettings gives it,
/// "port,baud,parity,bits,stop,mode"; false when it has another form.
bool parseSerialSettings(const std::string& text, std::string& port, LineSettings& line);

}  // namespace xtok::tools
