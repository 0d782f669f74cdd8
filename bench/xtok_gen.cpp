// The device side of the receive benchmark: makes a pseudo-terminal pair in
// raw mode and writes tokens into it.
//
//   xtok_gen saturation COUNT   COUNT tokens, as fast as the terminal takes them
//   xtok_gen linerate SECONDS   paced at 11,520 bytes/s (115200 baud 8N1),
//                               one token per write
//
// A token is STX (0x02), 20 printable bytes, ETX (0x03). The 20 bytes are the
// sequence number (8 hex digits) and the low 48 bits of CLOCK_MONOTONIC in
// nanoseconds at the moment of writing (12 hex digits).
//
// Protocol with the driver: the generator prints the reader's device path and
// the token count on one line ("/dev/pts/N COUNT"), then waits for a line on
// standard input before writing. When done it prints one JSON line and keeps
// the terminal open until standard input closes, so that the reader can
// drain what is still buffered.
#include <fcntl.h>
#include <termios.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

namespace {

constexpr int kTokenBytes = 22;
constexpr int kLineBytesPerSecond = 11520;
// Saturation writes this many tokens per write(2): 4092 bytes, just under a
// page, which the terminal takes in one piece whenever it has room.
constexpr int kTokensPerBurst = 186;

uint64_t nowNs() {
    timespec ts;
    clock_gettime(CLOCK_MONOTONIC, &ts);
    return static_cast<uint64_t>(ts.tv_sec) * 1000000000u + static_cast<uint64_t>(ts.tv_nsec);
}

void putHex(char* out, uint64_t value, int digits) {
    static const char kDigits[] = "0123456789abcdef";
    for (int i = digits - 1; i >= 0; --i) {
        out[i] = kDigits[value & 0xF];
        value >>= 4;
    }
}

void stamp(char* token, uint32_t sequence, uint64_t now) {
    token[0] = 0x02;
    putHex(token + 1, sequence, 8);
    putHex(token + 9, now & 0xFFFFFFFFFFFFull, 12);
    token[21] = 0x03;
}

[[noreturn]] void fail(const char* what) {
    std::fprintf(stderr, "xtok_gen: %s: %s\n", what, std::strerror(errno));
    std::exit(1);
}

void writeAll(int fd, const char* data, std::size_t length) {
    while (length > 0) {
        ssize_t put = ::write(fd, data, length);
        if (put < 0) {
            if (errno == EINTR) {
                continue;
            }
            fail("write");
        }
        data += put;
        length -= static_cast<std::size_t>(put);
    }
}

void makeRaw(int fd) {
    termios tio;
    if (tcgetattr(fd, &tio) != 0) {
        fail("tcgetattr");
    }
    cfmakeraw(&tio);
    cfsetispeed(&tio, B115200);
    cfsetospeed(&tio, B115200);
    if (tcsetattr(fd, TCSANOW, &tio) != 0) {
        fail("tcsetattr");
    }
}

void waitForLine() {
    char line[64];
    if (!std::fgets(line, sizeof line, stdin)) {
        std::exit(0);  // the driver gave up before the start
    }
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 3) {
        std::fprintf(stderr, "usage: xtok_gen saturation COUNT | linerate SECONDS\n");
        return 2;
    }
    const std::string mode = argv[1];
    const double amount = std::atof(argv[2]);
    uint32_t count;
    if (mode == "saturation") {
        count = static_cast<uint32_t>(amount);
    } else if (mode == "linerate") {
        count = static_cast<uint32_t>(amount * kLineBytesPerSecond / kTokenBytes);
    } else {
        std::fprintf(stderr, "xtok_gen: unknown mode %s\n", mode.c_str());
        return 2;
    }

    int master = posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
    if (master < 0 || grantpt(master) != 0 || unlockpt(master) != 0) {
        fail("posix_openpt");
    }
    const char* path = ptsname(master);
    if (!path) {
        fail("ptsname");
    }
    // Held open for the whole run: the reader's open and close then never
    // hang the line up, and the settings made here stay.
    int slave = ::open(path, O_RDWR | O_NOCTTY | O_CLOEXEC);
    if (slave < 0) {
        fail("open slave");
    }
    makeRaw(slave);
    makeRaw(master);

    std::printf("%s %u\n", path, count);
    std::fflush(stdout);
    waitForLine();

    const uint64_t start = nowNs();
    if (mode == "saturation") {
        std::vector<char> burst(static_cast<std::size_t>(kTokensPerBurst) * kTokenBytes);
        for (uint32_t sequence = 0; sequence < count;) {
            uint32_t n = std::min<uint32_t>(kTokensPerBurst, count - sequence);
            uint64_t now = nowNs();
            for (uint32_t i = 0; i < n; ++i) {
                stamp(burst.data() + i * kTokenBytes, sequence + i, now);
            }
            writeAll(master, burst.data(), static_cast<std::size_t>(n) * kTokenBytes);
            sequence += n;
        }
    } else {
        const double periodNs = 1e9 * kTokenBytes / kLineBytesPerSecond;
        char token[kTokenBytes];
        for (uint32_t sequence = 0; sequence < count; ++sequence) {
            uint64_t due = start + static_cast<uint64_t>(periodNs * sequence);
            timespec at{static_cast<time_t>(due / 1000000000u), static_cast<long>(due % 1000000000u)};
            while (clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &at, nullptr) == EINTR) {
            }
            stamp(token, sequence, nowNs());
            writeAll(master, token, kTokenBytes);
        }
    }
    const double seconds = static_cast<double>(nowNs() - start) / 1e9;
    std::printf("{\"tokens\": %u, \"bytes\": %llu, \"seconds\": %.6f}\n", count,
                static_cast<unsigned long long>(count) * kTokenBytes, seconds);
    std::fflush(stdout);

    // Until the driver has the reader's result.
    char rest[64];
    while (std::fgets(rest, sizeof rest, stdin)) {
    }
    ::close(slave);
    ::close(master);
    return 0;
}
