// Soak run: the plug-in in the PC host over a pseudo-terminal at line rate
// for a fixed time, with the tokens read and acknowledged as a runtime
// does. Reports tokens sent, received and lost and the process's memory at
// start and end; fails when a token is lost or memory keeps growing.
//
//   xtok_soak [--seconds N] [--plugin PATH]
#include <poll.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <string>
#include <thread>

#include "tools/plugin_session.h"
#include "tools/pty_pair.h"

namespace {

using Clock = std::chrono::steady_clock;

// 115200 baud 8N1.
constexpr double kBytesPerSecond = 11520.0;
// Memory may settle in the first seconds; growth past this after the
// warm-up counts as a leak.
constexpr long kAllowedGrowthKb = 1024;

long residentKb() {
    std::ifstream status("/proc/self/status");
    std::string line;
    while (std::getline(status, line)) {
        if (line.rfind("VmRSS:", 0) == 0) {
            return std::strtol(line.c_str() + 6, nullptr, 10);
        }
    }
    return -1;
}

std::string frame(uint32_t sequence) {
    char payload[32];
    std::snprintf(payload, sizeof payload, "%08X-soak-token-xx", sequence);
    return "\x02" + std::string(payload, 20) + "\x03";
}

bool writeAll(int fd, const std::string& bytes) {
    std::size_t done = 0;
    while (done < bytes.size()) {
        ssize_t n = ::write(fd, bytes.data() + done, bytes.size() - done);
        if (n > 0) {
            done += static_cast<std::size_t>(n);
        } else if (n < 0 && errno == EAGAIN) {
            pollfd p{fd, POLLOUT, 0};
            ::poll(&p, 1, 100);
        } else if (n < 0 && errno != EINTR) {
            return false;
        }
    }
    return true;
}

struct Counts {
    std::atomic<uint32_t> sent{0};
    uint32_t received = 0;
    uint32_t lost = 0;  // sequence gaps
    uint32_t malformed = 0;
    uint32_t expected = 0;
};

// Paced like a device on a 115200 baud line: one token per write.
void generate(int fd, double seconds, Counts& counts, std::atomic<bool>& failed) {
    const auto start = Clock::now();
    const auto end = start + std::chrono::duration<double>(seconds);
    double bytes = 0;
    for (uint32_t seq = 0; Clock::now() < end; ++seq) {
        std::string token = frame(seq);
        auto due = start + std::chrono::duration<double>(bytes / kBytesPerSecond);
        std::this_thread::sleep_until(due);
        if (!writeAll(fd, token)) {
            failed = true;
            return;
        }
        bytes += static_cast<double>(token.size());
        counts.sent = seq + 1;
    }
}

void consume(const xtok::tools::Token& token, Counts& counts) {
    unsigned sequence = 0;
    if (token.text.size() != 20 || std::sscanf(token.text.c_str(), "%8X", &sequence) != 1) {
        ++counts.malformed;
        return;
    }
    if (sequence > counts.expected) {
        counts.lost += sequence - counts.expected;
    }
    counts.expected = sequence + 1;
    ++counts.received;
}

int usage() {
    std::fprintf(stderr, "usage: xtok_soak [--seconds N] [--plugin PATH]\n");
    return 2;
}

}  // namespace

int main(int argc, char** argv) {
    double seconds = 60;
    std::string plugin = XTOK_PLUGIN_PATH;
    for (int i = 1; i < argc; ++i) {
        std::string arg = argv[i];
        if (arg == "--seconds" && i + 1 < argc) {
            seconds = std::atof(argv[++i]);
        } else if (arg == "--plugin" && i + 1 < argc) {
            plugin = argv[++i];
        } else {
            return usage();
        }
    }
    if (seconds <= 0) {
        return usage();
    }
    std::string error;
    auto pty = xtok::tools::PtyPair::open(error);
    if (!pty) {
        std::fprintf(stderr, "xtok_soak: %s\n", error.c_str());
        return 1;
    }
    xtok::tools::SessionOptions options;
    options.pluginPath = plugin;
    options.permanentStorage = false;
    options.config = "CfgVer=1 model=1 port=" + pty->slavePath() +
                     " baudrate=115200 parity=none bits=8 stopbits=1 mode=RS-232"
                     " rx_prefix=02 rx_suffix=03 token_queue_size=1000";
    auto session = xtok::tools::PluginSession::start(options, error);
    if (!session) {
        std::fprintf(stderr, "xtok_soak: %s\n", error.c_str());
        return 1;
    }

    Counts counts;
    std::atomic<bool> failed{false};
    std::atomic<bool> generated{false};
    std::thread generator([&] {
        generate(pty->master(), seconds, counts, failed);
        generated = true;
    });
    const auto warmUp = Clock::now() + std::chrono::duration<double>(std::min(5.0, seconds / 4));
    long startKb = -1;
    // After the last token is sent, the line gets a second to drain; what
    // has not arrived by then is lost.
    auto drainedBy = Clock::time_point::max();
    while (!failed && Clock::now() < drainedBy) {
        xtok::tools::Token token;
        auto intake = session->takeToken(token, error);
        if (intake == xtok::tools::Intake::Failed) {
            std::fprintf(stderr, "xtok_soak: %s\n", error.c_str());
            failed = true;
        } else if (intake == xtok::tools::Intake::Token) {
            consume(token, counts);
        } else {
            if (startKb < 0 && Clock::now() > warmUp) {
                startKb = residentKb();
            }
            if (generated && drainedBy == Clock::time_point::max()) {
                drainedBy = Clock::now() + std::chrono::seconds(1);
            }
            if (generated && counts.received >= counts.sent) {
                break;
            }
            // A runtime's scan cycle.
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
    }
    generator.join();
    const long endKb = residentKb();
    const uint32_t sent = counts.sent;
    const uint32_t missing = sent > counts.received ? sent - counts.received : 0;
    std::printf("soak: %.0f s at 11520 bytes/s: %u tokens sent, %u received, %u lost, %u malformed;"
                " memory %ld kB after warm-up, %ld kB at the end\n",
                seconds, sent, counts.received, missing, counts.malformed, startKb, endKb);
    bool ok = !failed && missing == 0 && counts.malformed == 0 &&
              (startKb < 0 || endKb - startKb <= kAllowedGrowthKb);
    if (!ok) {
        std::fprintf(stderr, "xtok_soak: FAILED\n");
    }
    return ok ? 0 : 1;
}
