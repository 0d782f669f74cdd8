// The receive path alone: the plug-in's framing passes over the host's lock
// and buffered byte read, with the line replaced by memory. No terminal and no
// system call: what remains is the cost per byte of the code a panel runs at
// line rate.
//
//   xtok_rx_bench [google benchmark flags]     the micro benchmark
//   xtok_rx_bench --replay MODE BYTES          receive about BYTES bytes in
//                                              MODE and exit; for callgrind
//
// MODE is one of prefix+suffix, suffix, prefix, gap (no prefix, no suffix).
//
// The protocol is the real one (the plug-in's code, linked statically), its
// locks are the host's mutex, and its port serves bytes through the
// host's ReadBuffer exactly as the host's SerialPort does, refilled from
// memory in 4 KiB pieces where the host calls read(2). Only the task is left
// out: the benchmark's thread runs the receive passes itself.
#include <benchmark/benchmark.h>

#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include "host/host_service.h"
#include "host/multitask.h"
#include "host/serial_port.h"
#include "module/interface_factory.h"
#include "protocol/protocol_xtok.h"
#include "protocol/xtok_config.h"

namespace {

using namespace xtok;

struct Mode {
    const char* name;
    const char* prefix;
    const char* suffix;
    std::string unit;       // bytes of one burst of the line
    bool silenceAfterUnit;  // a read time-out after each burst
    int tokensPerUnit;
};

std::string payload() {
    return "0001e2400a1b2c3d4e5f";  // 20 bytes, as the line benchmark sends
}

std::vector<Mode> modes() {
    std::string prefixed;
    for (int i = 0; i < 100; ++i) {
        prefixed += "\x02" + payload();
    }
    return {
        {"prefix+suffix", "02", "03", "\x02" + payload() + "\x03", false, 1},
        {"suffix", "none", "03", payload() + "\x03", false, 1},
        // A token ends at the next prefix; the last one of a burst at the gap.
        {"prefix", "02", "none", prefixed, true, 100},
        {"gap", "none", "none", payload(), true, 1},
    };
}

/// A line in memory: the same bursts over and over, with a read time-out
/// after each where the mode asks for silence.
class MemoryPort final : public ISerialPort {
public:
    explicit MemoryPort(const Mode& mode) : mode_(mode) {
        // Whole bursts only, so that a burst never straddles the wrap.
        while (feed_.size() < 64 * 1024) {
            feed_ += mode.unit;
        }
    }
    void* Destroy(unsigned) override { return this; }
    int32_t Reserved1() override { return 0; }
    int32_t Reserved2() override { return 0; }
    int32_t Reserved3() override { return 0; }
    bool Configure(int32_t, int32_t, int32_t, int32_t, int32_t) override { return true; }
    int32_t Reserved5() override { return 0; }
    // The host's ReadByte, with refill() in place of poll(2) and read(2).
    bool ReadByte(uint8_t* destination, int32_t, int32_t) override {
        if (destination && !buffer_.empty()) {
            *destination = buffer_.take();
            return true;
        }
        return readWaiting(destination);
    }
    bool Write(const uint8_t*, int32_t, int32_t) override { return true; }

    uint64_t bytesRead() const { return bytesRead_; }

private:
    [[gnu::noinline]] bool readWaiting(uint8_t* destination) {
        if (!destination || !refill()) {
            return false;
        }
        *destination = buffer_.take();
        return true;
    }

    bool refill() {
        if (silencePending_) {
            silencePending_ = false;
            return false;
        }
        std::size_t n = std::min(host::ReadBuffer::kCapacity, feed_.size() - at_);
        if (mode_.silenceAfterUnit) {
            if (unitLeft_ == 0) {
                unitLeft_ = mode_.unit.size();
            }
            n = std::min(n, unitLeft_);
            unitLeft_ -= n;
            silencePending_ = unitLeft_ == 0;
        }
        std::memcpy(buffer_.space(), feed_.data() + at_, n);
        buffer_.filled(n);
        bytesRead_ += n;
        at_ += n;
        if (at_ == feed_.size()) {
            at_ = 0;
        }
        return true;
    }

    const Mode& mode_;
    std::string feed_;
    std::size_t at_ = 0;
    std::size_t unitLeft_ = 0;
    bool silencePending_ = false;
    uint64_t bytesRead_ = 0;
    host::ReadBuffer buffer_;
};

class MemorySerialFactory final : public host::HostService<ISerialFactory> {
public:
    explicit MemorySerialFactory(const Mode& mode) : HostService("ISerialFactory"), port_(mode) {}
    ISerialPort* Open(const char*) override { return &port_; }
    void Close(ISerialPort*) override {}
    MemoryPort& port() { return port_; }

private:
    MemoryPort port_;
};

/// A task handle whose body never runs: the benchmark calls the passes
/// itself. Its Start says so, so that the protocol does not wait for a body
/// to finish when it goes.
class DormantTask final : public ITask {
public:
    void* Destroy(unsigned) override { return this; }
    int32_t Reserved1() override { return 0; }
    bool IsStopRequested() override { return true; }
    int32_t Reserved3() override { return 0; }
    bool Start() override { return false; }
};

/// The host's IMultiTask2 (its locks and sleep), less the task.
class BenchTasks final : public host::HostService<IMultiTask2> {
public:
    BenchTasks() : HostService("IMultiTask2") {}
    int32_t Reserved4() override { return 0; }
    bool StopTask(ITask*, int32_t) override { return true; }
    IMutex* CreateMutex(int32_t flags) override { return real_.CreateMutex(flags); }
    void DestroyMutex(IMutex* mutex) override { real_.DestroyMutex(mutex); }
    void Sleep(int32_t ms) override { real_.Sleep(ms); }
    int32_t Reserved9() override { return 0; }
    int32_t Reserved10() override { return 0; }
    int32_t Reserved11() override { return 0; }
    ITask* CreateTask(IRunnable*, int32_t, int32_t) override { return &task_; }

private:
    host::MultiTask real_;
    DormantTask task_;
};

class BenchHost final : public IServiceProvider {
public:
    explicit BenchHost(const Mode& mode) : serial_(mode) {}
    void* GetService(const char* name) override {
        std::string n = name ? name : "";
        if (n == "IMultiTask2")
            return static_cast<IMultiTask2*>(&tasks_);
        if (n == "ISerialFactory")
            return static_cast<ISerialFactory*>(&serial_);
        if (n == "ISocketFactory")
            return static_cast<ISocketFactory*>(&sockets_);
        if (n == "ICDSBuffer")
            return static_cast<ICDSBuffer*>(&cds_);
        return nullptr;
    }
    void ReleaseService(void*) override {}
    MemoryPort& port() { return serial_.port(); }

private:
    BenchTasks tasks_;
    MemorySerialFactory serial_;
    host::SocketFactory sockets_;
    host::CDSBuffer cds_;
};

/// The module initialised with the bench host and one started protocol.
class Session {
public:
    explicit Session(const Mode& mode) : host_(mode) {
        if (rootObject().module().Init(&host_) != 1) {
            std::fprintf(stderr, "module Init failed\n");
            std::exit(1);
        }
        protocol_ = static_cast<Protocol_XTOK*>(rootObject().factory().CreateProtocol("XTOK"));
        std::string config = std::string(
                                 "CfgVer=1 model=1 port=mem baudrate=115200 parity=none "
                                 "bits=8 stopbits=1 mode=RS-232 token_queue_size=10000 "
                                 "rx_prefix=") +
                             mode.prefix + " rx_suffix=" + mode.suffix;
        if (!protocol_->Configure(config.c_str()) || !protocol_->Start()) {
            std::fprintf(stderr, "protocol: %s\n", protocol_->GetLastErrorText());
            std::exit(1);
        }
    }
    ~Session() {
        protocol_->Stop();
        rootObject().factory().DestroyProtocol(protocol_);
        rootObject().module().Exit();
    }
    Protocol_XTOK& protocol() { return *protocol_; }
    MemoryPort& port() { return host_.port(); }
    /// What a runtime's acknowledgements do, one token at a time, outside
    /// the measurement.
    void drain() {
        char reply[32];
        protocol_->DoCommand("tokens_available", reply, sizeof reply);
        for (int n = std::atoi(reply); n > 0; --n) {
            protocol_->DoCommand("token_ack", reply, sizeof reply);
        }
    }

private:
    BenchHost host_;
    Protocol_XTOK* protocol_ = nullptr;
};

// Tokens queued before the benchmark acknowledges them all, well inside the
// queue's 10000, so that no push has to drop one.
constexpr int kTokensPerDrain = 4000;

void receivePath(benchmark::State& state, const Mode& mode) {
    Session session(mode);
    int queued = 0;
    const uint64_t before = session.port().bytesRead();
    for (auto _ : state) {
        session.protocol().receiveToken();
        if ((queued += mode.tokensPerUnit) >= kTokensPerDrain) {
            queued = 0;
            state.PauseTiming();
            session.drain();
            state.ResumeTiming();
        }
    }
    const double bytes = static_cast<double>(session.port().bytesRead() - before);
    state.SetBytesProcessed(static_cast<int64_t>(bytes));
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * mode.tokensPerUnit);
    state.counters["ns_per_byte"] =
        benchmark::Counter(bytes, benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

// The runtime's side of a token, through the protocol's slots: read
// rx_token, write token_ack (tokens_available once per batch of 1000).
void consumePath(benchmark::State& state) {
    static const std::vector<Mode> all = modes();
    Session session(all[0]);
    Protocol_XTOK& protocol = session.protocol();
    ITag* available = protocol.CreateTag("0?tokens_available?unsignedInt");
    ITag* token = protocol.CreateTag("0?rx_token?string-64");
    ITag* ack = protocol.CreateTag("0?token_ack?boolean");
    const uint8_t one = 1;
    char text[64];
    uint32_t n = 0;
    int64_t tokens = 0;
    for (auto _ : state) {
        state.PauseTiming();
        while (n < 1000) {
            protocol.receiveToken();
            ++n;
        }
        state.ResumeTiming();
        protocol.ReadTag(available, &n);
        for (; n > 0; --n) {
            protocol.ReadTag(token, text);
            protocol.WriteTag(ack, &one);
        }
        tokens += 1000;
    }
    state.SetItemsProcessed(tokens);
    state.counters["ns_per_token"] = benchmark::Counter(
        static_cast<double>(tokens), benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
    protocol.DeleteTag(available);
    protocol.DeleteTag(token);
    protocol.DeleteTag(ack);
}

// The floor under the reader's CPU at line rate: every token wakes two
// threads, the receive task (data on the line) and the runtime's (a token in
// the queue). Here one thread sleeps out a token's time at 115200 baud, then
// wakes the other through a pipe, and nothing else happens: the process CPU
// per round is what the two wake-ups cost on this machine.
void twoWakeUps(benchmark::State& state) {
    int pipeFds[2];
    if (pipe(pipeFds) != 0) {
        state.SkipWithError("pipe");
        return;
    }
    std::thread other([&] {
        char c;
        while (read(pipeFds[0], &c, 1) == 1 && c == 't') {
        }
    });
    const timespec tokenTime{0, 1909722};  // 22 bytes at 11,520 bytes/s
    for (auto _ : state) {
        nanosleep(&tokenTime, nullptr);
        if (write(pipeFds[1], "t", 1) != 1) {
            state.SkipWithError("write");
            break;
        }
    }
    if (write(pipeFds[1], "q", 1) != 1) {
        state.SkipWithError("write");
    }
    other.join();
    close(pipeFds[0]);
    close(pipeFds[1]);
}

// The host's lock as the receive task uses it: one thread, lock and unlock.
void hostLock(benchmark::State& state) {
    host::MultiTask tasks;
    IMutex* mutex = tasks.CreateMutex(0);
    for (auto _ : state) {
        mutex->Lock();
        benchmark::ClobberMemory();
        mutex->Unlock();
    }
    tasks.DestroyMutex(mutex);
}

// A configuration of many node sections, read as Configure reads it: the
// reader must stay linear in their number.
void manyNodes(benchmark::State& state) {
    const auto count = static_cast<std::size_t>(state.range(0));
    std::string text =
        "CfgVer=1 model=1 port=com1 baudrate=9600 parity=none bits=8 stopbits=1 mode=RS-232";
    for (std::size_t i = 0; i < count; ++i) {
        text += " Node" + std::to_string(i) + "::model=1";
    }
    for (auto _ : state) {
        XtokConfig config;
        if (!config.Parse(text) || config.nodes().size() != count) {
            state.SkipWithError("the configuration was not read whole");
            break;
        }
    }
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations() * count));
}

int replay(const std::string& name, uint64_t bytes) {
    for (const Mode& mode : modes()) {
        if (name != mode.name) {
            continue;
        }
        Session session(mode);
        uint64_t passes = 0;
        int queued = 0;
        while (session.port().bytesRead() < bytes) {
            session.protocol().receiveToken();
            ++passes;
            if ((queued += mode.tokensPerUnit) >= kTokensPerDrain) {
                queued = 0;
                session.drain();
            }
        }
        std::printf("{\"mode\": \"%s\", \"bytes\": %llu, \"passes\": %llu}\n", mode.name,
                    static_cast<unsigned long long>(session.port().bytesRead()),
                    static_cast<unsigned long long>(passes));
        return 0;
    }
    std::fprintf(stderr, "unknown mode %s\n", name.c_str());
    return 2;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc == 4 && std::strcmp(argv[1], "--replay") == 0) {
        return replay(argv[2], std::strtoull(argv[3], nullptr, 10));
    }
    static const std::vector<Mode> all = modes();
    for (const Mode& mode : all) {
        benchmark::RegisterBenchmark((std::string("ReceivePath/") + mode.name).c_str(),
                                     [&mode](benchmark::State& s) { receivePath(s, mode); });
    }
    benchmark::RegisterBenchmark("HostLock/LockUnlock", hostLock);
    benchmark::RegisterBenchmark("Runtime/ReadAndAck", consumePath);
    benchmark::RegisterBenchmark("Configure/Nodes", manyNodes)
        ->Arg(10000)
        ->Arg(100000)
        ->Unit(benchmark::kMillisecond);
    benchmark::RegisterBenchmark("Kernel/TwoWakeUpsPerToken", twoWakeUps)
        ->MeasureProcessCPUTime()
        ->UseRealTime()
        ->Iterations(500);
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
