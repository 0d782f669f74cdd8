// Lines made on one thread and printed on another: the monitor's events wait
// here for the console's thread, which sleeps in poll(2) on fd() meanwhile.
#pragma once

#include <cstddef>
#include <mutex>
#include <string>
#include <vector>

namespace xtok::tools {

class EventLines {
public:
    EventLines();
    ~EventLines();
    EventLines(const EventLines&) = delete;
    EventLines& operator=(const EventLines&) = delete;

    /// From any thread. Past a bound on what waits, lines are counted and
    /// dropped instead: a console that stopped reading must not make the
    /// receive task wait or the memory grow.
    void push(std::string line);
    /// Readable while lines wait; -1 when the system gave no pipe (then the
    /// lines are only taken between commands).
    int fd() const { return wakeRead_; }
    /// The waiting lines, oldest first; `dropped` how many were dropped
    /// since the last take.
    std::vector<std::string> take(std::size_t& dropped);

private:
    int wakeRead_ = -1;
    int wakeWrite_ = -1;
    std::mutex mutex_;
    std::vector<std::string> lines_;
    std::size_t bytes_ = 0;
    std::size_t dropped_ = 0;
};

}  // namespace xtok::tools
