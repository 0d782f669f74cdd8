// The console's side of the line monitor: switched on and off on the
// session's line, its lines printed on the console's own thread, to the
// console and to a log file.
#pragma once

#include <fstream>
#include <iosfwd>
#include <memory>
#include <string>
#include <vector>

#include "tools/line_input.h"
#include "tools/line_monitor.h"
#include "tools/plugin_session.h"

namespace xtok::tools {

/// Opens `path` for the monitor's lines, appending. False with `error` set
/// when it cannot.
bool openLog(const std::string& path, std::ofstream& file, std::string& error);

class MonitorConsole final : public EventFeed {
public:
    /// With `json`, one JSON object per event.
    MonitorConsole(PluginSession& session, bool json, std::ostream& out, std::ostream& err);

    /// Writes every line to `file` (opened by openLog on `path`) as well.
    void logTo(std::ofstream file, const std::string& path);
    /// Follows the line from now on without showing it: the queue's tokens
    /// are then known whole and with the time they arrived.
    void follow();
    void on();
    void off();
    bool isOn() const { return on_; }
    /// Ends the session after `count` tokens.
    void stopAfter(long count) { monitor_->stopAfter(count); }

    int fd() const override { return monitor_->lines().fd(); }
    bool print() override;

private:
    void log(const std::vector<std::string>& lines);

    PluginSession& session_;
    std::shared_ptr<LineMonitor> monitor_;
    std::ostream& out_;
    std::ostream& err_;
    const bool json_;
    std::ofstream log_;
    std::string logPath_;
    bool on_ = false;
    bool following_ = false;
};

}  // namespace xtok::tools
