// "ISerialFactory": serial ports by the runtime's names.
#pragma once

#include <atomic>
#include <mutex>
#include <set>
#include <string>

#include "host/com_map.h"
#include "host/host_service.h"
#include "host/notice.h"

namespace xtok::host {

class SerialFactory final : public HostService<ISerialFactory> {
public:
    explicit SerialFactory(ComMap ports = ComMap(), Notice notice = printNotice);

    /// Null when the name is unknown or the device cannot be opened; the
    /// reason goes to the notice, since the plug-in only learns "no port".
    ISerialPort* Open(const char* name) override;
    void Close(ISerialPort* port) override;

    /// For the ports' own complaints.
    void notice(const std::string& text) const { notice_(text); }
    /// A port's refusal of line settings, said as a notice and counted.
    void refused(const std::string& text) {
        ++refusals_;
        notice_(text);
    }
    /// How many line settings were refused so far: a failed open with no
    /// new refusal failed on the device, not on its settings.
    int refusals() const { return refusals_; }
    /// Says `text` only the first time it is given for `key`.
    void noticeOnce(const std::string& key, const std::string& text);

private:
    ComMap ports_;
    Notice notice_;
    std::mutex mutex_;
    std::set<std::string> noticed_;
    std::atomic<int> refusals_{0};
};

}  // namespace xtok::host
