#include "tests/tools/subprocess.h"

#include <fcntl.h>
#include <grp.h>
#include <poll.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <sstream>

namespace xtok::tools::test {

namespace {

using Clock = std::chrono::steady_clock;

// What a healthy run of any subcommand stays well below.
constexpr std::chrono::milliseconds kToolPatience{30000};
constexpr uid_t kNobody = 65534;

int remainingMs(Clock::time_point deadline) {
    auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
    return left > 0 ? static_cast<int>(left) : 0;
}

[[noreturn]] void becomeChild(const std::vector<std::string>& arguments, int in, int out, int err,
                              bool asNobody) {
    dup2(in, STDIN_FILENO);
    dup2(out, STDOUT_FILENO);
    dup2(err, STDERR_FILENO);
    if (asNobody && geteuid() == 0 &&
        (setgroups(0, nullptr) != 0 || setgid(kNobody) != 0 || setuid(kNobody) != 0)) {
        _exit(126);
    }
    std::vector<char*> argv;
    for (const std::string& argument : arguments) {
        argv.push_back(const_cast<char*>(argument.c_str()));
    }
    argv.push_back(nullptr);
    execv(argv[0], argv.data());
    _exit(127);
}

}  // namespace

Subprocess::Subprocess(std::vector<std::string> arguments, std::string input, bool asNobody)
    : input_(std::move(input)) {
    // A child that exits before reading its input must not kill the test.
    signal(SIGPIPE, SIG_IGN);
    int in[2], out[2], err[2];
    if (pipe2(in, O_CLOEXEC) != 0 || pipe2(out, O_CLOEXEC) != 0 || pipe2(err, O_CLOEXEC) != 0) {
        return;
    }
    pid_ = fork();
    if (pid_ == 0) {
        becomeChild(arguments, in[0], out[1], err[1], asNobody);
    }
    ::close(in[0]);
    ::close(out[1]);
    ::close(err[1]);
    in_ = in[1];
    out_ = out[0];
    err_ = err[0];
    fcntl(in_, F_SETFL, O_NONBLOCK);
    if (input_.empty()) {
        closeFd(in_);
    }
}

Subprocess::~Subprocess() {
    if (pid_ > 0) {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }
    closeFd(in_);
    closeFd(out_);
    closeFd(err_);
}

void Subprocess::closeFd(int& fd) {
    if (fd >= 0) {
        ::close(fd);
        fd = -1;
    }
}

bool Subprocess::pump(int timeoutMs) {
    pollfd ready[3] = {{out_, POLLIN, 0}, {err_, POLLIN, 0}, {in_, POLLOUT, 0}};
    if (out_ < 0 && err_ < 0) {
        return false;
    }
    if (poll(ready, 3, timeoutMs) <= 0) {
        return true;
    }
    char buffer[4096];
    int* fds[2] = {&out_, &err_};
    std::string* sinks[2] = {&result_.out, &result_.err};
    for (int i = 0; i < 2; ++i) {
        if (ready[i].revents) {
            ssize_t got = ::read(*fds[i], buffer, sizeof buffer);
            if (got > 0) {
                sinks[i]->append(buffer, static_cast<std::size_t>(got));
            } else if (got == 0 || errno != EINTR) {
                closeFd(*fds[i]);
            }
        }
    }
    if (ready[2].revents) {
        ssize_t put = ::write(in_, input_.data() + written_, input_.size() - written_);
        written_ += put > 0 ? static_cast<std::size_t>(put) : 0;
        if (put < 0 || written_ == input_.size()) {
            closeFd(in_);
        }
    }
    return true;
}

bool Subprocess::waitForOutput(const std::string& text, std::chrono::milliseconds patience) {
    Clock::time_point deadline = Clock::now() + patience;
    while (result_.out.find(text) == std::string::npos) {
        if (Clock::now() >= deadline || !pump(remainingMs(deadline))) {
            return false;
        }
    }
    return true;
}

void Subprocess::interrupt() {
    if (pid_ > 0) {
        kill(pid_, SIGINT);
    }
}

Finished Subprocess::finish(std::chrono::milliseconds patience) {
    Clock::time_point deadline = Clock::now() + patience;
    while (Clock::now() < deadline && pump(remainingMs(deadline))) {
    }
    // Both outputs ended: the child is exiting. Its end is waited for with
    // the same deadline, in short steps, as there is no descriptor for it.
    int status = 0;
    pid_t ended = 0;
    while (pid_ > 0 && (ended = waitpid(pid_, &status, WNOHANG)) == 0 && Clock::now() < deadline) {
        poll(nullptr, 0, 2);
    }
    if (pid_ > 0 && ended != pid_) {
        result_.timedOut = true;
        kill(pid_, SIGKILL);
        waitpid(pid_, &status, 0);
    }
    pid_ = -1;
    result_.status = WIFEXITED(status) && !result_.timedOut ? WEXITSTATUS(status) : -1;
    return result_;
}

Finished runTool(const std::vector<std::string>& arguments, const std::string& input,
                 bool asNobody) {
    return Subprocess(arguments, input, asNobody).finish(kToolPatience);
}

std::vector<std::string> linesOf(const std::string& text) {
    std::vector<std::string> lines;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) {
        lines.push_back(line);
    }
    return lines;
}

}  // namespace xtok::tools::test
