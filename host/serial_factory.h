// "ISerialFactory": serial ports by the runtime's names.
#pragma once

#include <atomic>
#include <map>
#include <mutex>
#include <set>
#include <string>
#include <vector>

#include "host/com_map.h"
#include "host/host_service.h"
#include "host/line_tap.h"
#include "host/notice.h"

namespace xtok::host {

class SerialPort;

class SerialFactory final : public HostService<ISerialFactory> {
public:
    /// With `reconnect`, its ports reopen a lost device (SerialPort).
    explicit SerialFactory(ComMap ports = ComMap(), Notice notice = printNotice,
                           bool reconnect = false);

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

    bool reconnects() const { return reconnect_; }
    /// From now on every port tells `tap` what it hears; null stops that. A
    /// tap may still be called once more after it was replaced, so it must
    /// outlive the ports.
    void attach(LineTap* tap);
    LineTap* tap() const { return tap_.load(std::memory_order_acquire); }
    /// A port's link change: kept as its line's state and told to the tap.
    void link(LinkChange change, const std::string& device, const std::string& settings = "",
              const std::string& reason = "");
    /// The latest opening, closing, loss or reconnection of each device.
    std::vector<LinkEvent> lineStates() const;

private:
    ComMap ports_;
    Notice notice_;
    bool reconnect_;
    std::atomic<LineTap*> tap_{nullptr};
    mutable std::mutex mutex_;
    std::set<std::string> noticed_;
    std::atomic<int> refusals_{0};
    std::set<SerialPort*> open_;
    std::map<std::string, LinkEvent> states_;
};

}  // namespace xtok::host
