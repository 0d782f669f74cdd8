// What the benchmark's application does with each token, the same in every
// reader: check its form and sequence number, and note its latency. Also the
// reader's CPU time from the first data to the last token.
#pragma once

#include <sys/resource.h>
#include <time.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

namespace xtok::bench {

inline uint64_t nowNs() {
    timespec ts;
    clock_gettime(CLOCK_MONOTONIC, &ts);
    return static_cast<uint64_t>(ts.tv_sec) * 1000000000u + static_cast<uint64_t>(ts.tv_nsec);
}

/// User and system time of the whole process, every thread.
inline double processCpuSeconds() {
    rusage usage;
    getrusage(RUSAGE_SELF, &usage);
    return static_cast<double>(usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) +
           static_cast<double>(usage.ru_utime.tv_usec + usage.ru_stime.tv_usec) / 1e6;
}

class TokenCheck {
public:
    static constexpr uint64_t kMask = (uint64_t{1} << 48) - 1;
    static constexpr std::size_t kPayload = 20;
    static constexpr std::size_t kFrame = 22;

    // The latency record is written through once here (clear keeps the
    // capacity), so that the reader's memory does not grow by 8 bytes a
    // token: the soak reads that growth as the plug-in's.
    explicit TokenCheck(uint32_t count) : count_(count) {
        latencies_.resize(count);
        latencies_.clear();
    }

    /// The application's first sight of data: starts the CPU and time window.
    void firstData() {
        if (!started_) {
            started_ = true;
            startNs_ = nowNs();
            startCpu_ = processCpuSeconds();
        }
    }
    bool started() const { return started_; }
    bool done() const { return done_; }

    /// One token's payload (the bytes between STX and ETX) seen at `now`.
    void token(const char* payload, std::size_t length, uint64_t now) {
        uint64_t sequence = 0;
        uint64_t stamp = 0;
        if (length != kPayload || !hex(payload, 8, sequence) || !hex(payload + 8, 12, stamp)) {
            ++malformed_;
            return;
        }
        if (sequence < expected_) {
            ++malformed_;  // repeated or out of order
            return;
        }
        lost_ += sequence - expected_;
        expected_ = sequence + 1;
        ++received_;
        lastNs_ = now;
        latencies_.push_back(((now & kMask) - stamp) & kMask);
        if (sequence + 1 >= count_) {
            finish();
        }
    }

    /// No more data is coming: the time window ends at the last token, the
    /// CPU window now (so it holds the wait for more).
    void gaveUp() {
        if (!done_) {
            finish();
            endNs_ = lastNs_ ? lastNs_ : endNs_;
        }
    }

    std::string json(const std::string& reader) {
        std::sort(latencies_.begin(), latencies_.end());
        const double seconds = static_cast<double>(endNs_ - startNs_) / 1e9;
        char line[512];
        std::snprintf(line, sizeof line,
                      "{\"reader\": \"%s\", \"tokens\": %llu, \"lost\": %llu, \"malformed\": %llu, "
                      "\"bytes\": %llu, \"seconds\": %.6f, \"cpu\": %.6f, \"lat_p50_ns\": %llu, "
                      "\"lat_p99_ns\": %llu, \"lat_max_ns\": %llu}",
                      reader.c_str(), ull(received_), ull(lost_), ull(malformed_),
                      ull(received_ * kFrame), seconds, endCpu_ - startCpu_, ull(percentile(0.50)),
                      ull(percentile(0.99)), ull(latencies_.empty() ? 0 : latencies_.back()));
        return line;
    }

private:
    static unsigned long long ull(uint64_t v) { return static_cast<unsigned long long>(v); }

    static bool hex(const char* text, int digits, uint64_t& value) {
        value = 0;
        for (int i = 0; i < digits; ++i) {
            char c = text[i];
            unsigned d;
            if (c >= '0' && c <= '9') {
                d = static_cast<unsigned>(c - '0');
            } else if (c >= 'a' && c <= 'f') {
                d = static_cast<unsigned>(c - 'a' + 10);
            } else if (c >= 'A' && c <= 'F') {
                d = static_cast<unsigned>(c - 'A' + 10);
            } else {
                return false;
            }
            value = value << 4 | d;
        }
        return true;
    }

    void finish() {
        done_ = true;
        endNs_ = nowNs();
        endCpu_ = processCpuSeconds();
        // Tokens after the last one that arrived never came.
        if (expected_ < count_) {
            lost_ += count_ - expected_;
        }
    }

    uint64_t percentile(double p) const {
        if (latencies_.empty()) {
            return 0;
        }
        std::size_t i =
            static_cast<std::size_t>(p * static_cast<double>(latencies_.size() - 1) + 0.5);
        return latencies_[std::min(i, latencies_.size() - 1)];
    }

    uint64_t count_;
    uint64_t expected_ = 0;
    uint64_t received_ = 0;
    uint64_t lost_ = 0;
    uint64_t malformed_ = 0;
    bool started_ = false;
    bool done_ = false;
    uint64_t startNs_ = 0, endNs_ = 0, lastNs_ = 0;
    double startCpu_ = 0, endCpu_ = 0;
    std::vector<uint64_t> latencies_;
};

}  // namespace xtok::bench
