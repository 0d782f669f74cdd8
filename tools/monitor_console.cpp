#include "tools/monitor_console.h"

#include <cerrno>
#include <cstring>
#include <ostream>

#include "tools/monitor_lines.h"

namespace xtok::tools {

MonitorConsole::MonitorConsole(PluginSession& session, bool json, std::ostream& out,
                               std::ostream& err)
    : session_(session),
      monitor_(std::make_shared<LineMonitor>(session.framingSource(), session.queue(), json)),
      out_(out),
      err_(err),
      json_(json) {}

bool openLog(const std::string& path, std::ofstream& file, std::string& error) {
    file.open(path, std::ios::app | std::ios::binary);
    if (!file) {
        error = "cannot open the log " + path + ": " + std::strerror(errno);
        return false;
    }
    return true;
}

void MonitorConsole::logTo(std::ofstream file, const std::string& path) {
    log_ = std::move(file);
    logPath_ = path;
}

void MonitorConsole::follow() {
    if (!following_) {
        monitor_->restart();
        session_.follow(monitor_);
        following_ = true;
    }
}

void MonitorConsole::on() {
    monitor_->show(true);
    follow();
    on_ = true;
}

void MonitorConsole::off() {
    if (on_) {
        monitor_->show(false);
        on_ = false;
        print();  // what it heard before, not after the next "on"
    }
}

bool MonitorConsole::print() {
    // Asked first: once finished, every line it made is waiting already.
    const bool finished = monitor_->finished();
    std::size_t dropped = 0;
    std::vector<std::string> lines = monitor_->lines().take(dropped);
    if (dropped > 0) {
        lines.push_back(linesDroppedLine(dropped, json_));
    }
    for (const std::string& line : lines) {
        out_ << line << '\n';
    }
    out_.flush();
    log(lines);
    return !finished;
}

void MonitorConsole::log(const std::vector<std::string>& lines) {
    if (!log_.is_open() || lines.empty()) {
        return;
    }
    for (const std::string& line : lines) {
        log_ << line << '\n';
    }
    if (!log_.flush()) {
        err_ << "xtok-host: cannot write the log " << logPath_ << "; the monitor goes on without it"
             << std::endl;
        log_.close();
    }
}

}  // namespace xtok::tools
