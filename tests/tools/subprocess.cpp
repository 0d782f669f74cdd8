#include "tests/tools/subprocess.h"

#include <fcntl.h>
#include <grp.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <sstream>
#include <thread>

namespace xtok::tools::test {

namespace {

using Clock = std::chrono::steady_clock;
constexpr uid_t kNobody = 65534;

std::string contentOf(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

/// Standard input: the file of `input`, or the terminal, which a new
/// session's leader takes as its controlling terminal by opening it.
int childInput(const std::string& dir, const std::string& terminal) {
    if (terminal.empty()) {
        return open((dir + "/in").c_str(), O_RDONLY);
    }
    return setsid() < 0 ? -1 : open(terminal.c_str(), O_RDWR);
}

[[noreturn]] void becomeChild(const std::vector<std::string>& arguments, const std::string& dir,
                              bool asNobody, const std::string& terminal) {
    const int in = childInput(dir, terminal);
    const int out = open((dir + "/out").c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0666);
    const int err = open((dir + "/err").c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0666);
    if (in < 0 || out < 0 || err < 0 || dup2(in, 0) < 0 || dup2(out, 1) < 0 || dup2(err, 2) < 0 ||
        (asNobody && geteuid() == 0 &&
         (setgroups(0, nullptr) != 0 || setgid(kNobody) != 0 || setuid(kNobody) != 0))) {
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

Subprocess::Subprocess(std::vector<std::string> arguments, std::string input, bool asNobody,
                       std::string terminal) {
    char dir[] = "/tmp/xtok-run-XXXXXX";
    dir_ = mkdtemp(dir) ? dir : "/tmp";
    chmod(dir_.c_str(), 0777);  // a child run as nobody writes its output here
    std::ofstream(file("in"), std::ios::binary) << input;
    pid_ = fork();
    if (pid_ == 0) {
        becomeChild(arguments, dir_, asNobody, terminal);
    }
}

Subprocess::~Subprocess() {
    if (pid_ > 0) {
        kill(pid_, SIGKILL);
        waitpid(pid_, nullptr, 0);
    }
    std::error_code ignored;
    std::filesystem::remove_all(dir_, ignored);
}

std::string Subprocess::file(const char* name) const {
    return dir_ + "/" + name;
}

// The output is a file, with nothing to wait on: it is looked at every millisecond.
bool Subprocess::waitForOutput(const std::string& text, std::chrono::milliseconds patience,
                               int times) {
    const auto deadline = Clock::now() + patience;
    while (countOf(contentOf(file("out")), text) < times) {
        if (Clock::now() > deadline) {
            return false;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return true;
}

void Subprocess::interrupt() {
    kill(pid_, SIGINT);
}

Finished Subprocess::finish(std::chrono::milliseconds patience) {
    Finished result;
    const auto deadline = Clock::now() + patience;
    int status = 0;
    while (waitpid(pid_, &status, WNOHANG) == 0) {
        if (Clock::now() > deadline) {
            result.timedOut = true;
            kill(pid_, SIGKILL);
            waitpid(pid_, &status, 0);
            break;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    pid_ = -1;
    result.status = WIFEXITED(status) && !result.timedOut ? WEXITSTATUS(status) : -1;
    result.out = contentOf(file("out"));
    result.err = contentOf(file("err"));
    return result;
}

Finished runTool(const std::vector<std::string>& arguments, const std::string& input,
                 bool asNobody) {
    return Subprocess(arguments, input, asNobody).finish(std::chrono::seconds(30));
}

int countOf(const std::string& text, const std::string& part) {
    int count = 0;
    for (std::size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) {
        ++count;
    }
    return count;
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
