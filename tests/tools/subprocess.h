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
    /// input. With `asNobody`, a root test drops the child to user nobody, so
    /// that file permissions apply to it.
    explicit Subprocess(std::vector<std::string> arguments, std::string input = "",
                        bool asNobody = false);
    /// Kills the child if it still runs, and reaps it.
    ~Subprocess();
    Subprocess(const Subprocess&) = delete;
    Subprocess& operator=(const Subprocess&) = delete;

    /// Reads output until standard output holds `text`; false when the
    /// deadline passed or the output ended first.
    bool waitForOutput(const std::string& text, std::chrono::milliseconds patience);
    /// Ctrl-C, as a person at the terminal would press it.
    void interrupt();
    /// Waits for the child to end, killing it at the deadline.
    Finished finish(std::chrono::milliseconds patience);

private:
    /// One round of reading and writing; false once nothing is left open.
    bool pump(int timeoutMs);
    void closeFd(int& fd);

    pid_t pid_ = -1;
    int in_ = -1;
    int out_ = -1;
    int err_ = -1;
    std::string input_;
    std::size_t written_ = 0;
    Finished result_;
};

/// Runs to the end with a generous deadline.
Finished runTool(const std::vector<std::string>& arguments, const std::string& input = "",
                 bool asNobody = false);

/// Lines of `text`, without their line feeds.
std::vector<std::string> linesOf(const std::string& text);

}  // namespace xtok::tools::test
