// The built xtok-host run as a user runs it: arguments, standard input, and
// its output and exit status, with a deadline after which it is killed.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <string>
#include <vector>

namespace xtok::tools::test {

struct Finished {
    int status = -1;  // the exit status; -1 when killed or ended by a signal
    bool timedOut = false;
    std::string out;
    std::string err;
};

class Subprocess {
public:
    /// Starts `arguments` (the program first) with `input` on its standard
    /// input; its output goes to files, read as it grows. With `asNobody`, a
    /// root test drops the child to user nobody, so that file permissions apply.
    /// With a `terminal` (a pseudo-terminal's slave), the child runs in a
    /// session of its own with that as its controlling terminal and standard
    /// input, in place of `input`.
    explicit Subprocess(std::vector<std::string> arguments, std::string input = "",
                        bool asNobody = false, std::string terminal = "");
    /// Kills the child if it still runs, and reaps it.
    ~Subprocess();
    Subprocess(const Subprocess&) = delete;
    Subprocess& operator=(const Subprocess&) = delete;

    /// Waits until standard output holds `text` `times` times; false at the deadline.
    bool waitForOutput(const std::string& text, std::chrono::milliseconds patience, int times = 1);
    pid_t pid() const { return pid_; }
    /// Ctrl-C, as a person at the terminal would press it.
    void interrupt();
    /// Waits for the child to end, killing it at the deadline.
    Finished finish(std::chrono::milliseconds patience);

private:
    std::string file(const char* name) const;

    pid_t pid_ = -1;
    std::string dir_;
};

/// Runs to the end with a generous deadline.
Finished runTool(const std::vector<std::string>& arguments, const std::string& input = "",
                 bool asNobody = false);

/// How often `part` occurs in `text`, overlaps counted.
int countOf(const std::string& text, const std::string& part);

/// Lines of `text`, without their line feeds.
std::vector<std::string> linesOf(const std::string& text);

}  // namespace xtok::tools::test
