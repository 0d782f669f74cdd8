// The xtokline reader of the receive benchmark: the PC host with the built
// plug-in, consuming tokens the way a panel runtime does, through the
// protocol's slots: read tokens_available, then for each token read rx_token
// and write token_ack.
//
//   xtok_reader PLUGIN DEVICE COUNT [--poll-us N] [--idle-ms N]
//
// A look at tokens_available that finds tokens reads them all and looks
// again; one that finds none waits --poll-us (1000), a runtime's scan cycle.
//
// Prints "ready" once the port is open and the receive task runs, then one
// JSON line with the result (the fields of bench/token_check.h and the
// process's resident memory once a quarter of the tokens arrived and at the
// end, for the soak run) once token COUNT-1 has arrived, or after --idle-ms
// without data once data has begun.
#include <sys/resource.h>
#include <time.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <string>
#include <vector>

#include "bench/token_check.h"
#include "host/plugin_loader.h"
#include "host/service_provider.h"

namespace {

using namespace xtok;

struct Options {
    std::string plugin;
    std::string device;
    uint32_t count = 0;
    int pollUs = 1000;
    int idleMs = 1000;
};

bool parse(int argc, char** argv, Options& o) {
    if (argc < 4) {
        return false;
    }
    o.plugin = argv[1];
    o.device = argv[2];
    o.count = static_cast<uint32_t>(std::strtoul(argv[3], nullptr, 10));
    for (int i = 4; i + 1 < argc; i += 2) {
        std::string key = argv[i];
        const char* value = argv[i + 1];
        if (key == "--poll-us") {
            o.pollUs = std::atoi(value);
        } else if (key == "--idle-ms") {
            o.idleMs = std::atoi(value);
        } else {
            return false;
        }
    }
    return o.count > 0 && o.pollUs > 0;
}

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

void sleepUs(int us) {
    timespec ts{us / 1000000, (us % 1000000) * 1000L};
    nanosleep(&ts, nullptr);
}

}  // namespace

int main(int argc, char** argv) {
    Options opt;
    if (!parse(argc, argv, opt)) {
        std::fprintf(stderr,
                     "usage: xtok_reader PLUGIN DEVICE COUNT [--poll-us N] [--idle-ms N]\n");
        return 2;
    }

    host::HostOptions hostOptions;
    hostOptions.permanentStorage = false;  // no retained settings over ours
    std::string error;
    std::unique_ptr<host::ServiceProvider> services =
        host::ServiceProvider::create(hostOptions, error);
    if (!services) {
        std::fprintf(stderr, "xtok_reader: %s\n", error.c_str());
        return 1;
    }
    std::unique_ptr<host::LoadedPlugin> plugin =
        host::LoadedPlugin::load(opt.plugin, *services, error);
    if (!plugin) {
        std::fprintf(stderr, "xtok_reader: %s\n", error.c_str());
        return 1;
    }
    IProtocol7* protocol = plugin->createProtocol("XTOK", error);
    if (!protocol) {
        std::fprintf(stderr, "xtok_reader: %s\n", error.c_str());
        return 1;
    }
    const std::string config = "CfgVer=1 model=1 port=" + opt.device +
                               " baudrate=115200 parity=none bits=8 stopbits=1 mode=RS-232"
                               " rx_prefix=02 rx_suffix=03 token_queue_size=10000";
    ITag* available = nullptr;
    ITag* token = nullptr;
    ITag* ack = nullptr;
    if (!protocol->Configure(config.c_str()) ||
        !(available = protocol->CreateTag("0?tokens_available?unsignedInt")) ||
        !(token = protocol->CreateTag("0?rx_token?string-64")) ||
        !(ack = protocol->CreateTag("0?token_ack?boolean")) || !protocol->Start()) {
        std::fprintf(stderr, "xtok_reader: %s\n", protocol->GetLastErrorText());
        return 1;
    }
    std::printf("ready\n");
    std::fflush(stdout);

    bench::TokenCheck check(opt.count);
    const uint8_t one = 1;
    char text[64];
    uint64_t lastDataNs = 0;
    uint32_t taken = 0;
    long warmKb = -1;
    for (;;) {
        uint32_t n = 0;
        if (!protocol->ReadTag(available, &n)) {
            std::fprintf(stderr, "xtok_reader: %s\n", protocol->GetLastErrorText());
            return 1;
        }
        if (n > 0) {
            check.firstData();
            for (uint32_t i = 0; i < n && !check.done(); ++i) {
                if (!protocol->ReadTag(token, text) || !protocol->WriteTag(ack, &one)) {
                    std::fprintf(stderr, "xtok_reader: %s\n", protocol->GetLastErrorText());
                    return 1;
                }
                check.token(text, std::strlen(text), bench::nowNs());
                warmKb = ++taken == opt.count / 4 ? residentKb() : warmKb;
            }
            lastDataNs = bench::nowNs();
            if (check.done()) {
                break;
            }
        } else if (check.started() && bench::nowNs() - lastDataNs > opt.idleMs * 1000000ull) {
            check.gaveUp();
            break;
        }
        if (n == 0) {
            sleepUs(opt.pollUs);  // a busy runtime scans again at once
        }
    }
    std::string result = check.json("xtokline");
    result.insert(result.size() - 1, ", \"rss_warm_kb\": " + std::to_string(warmKb) +
                                          ", \"rss_end_kb\": " + std::to_string(residentKb()));
    std::printf("%s\n", result.c_str());
    std::fflush(stdout);
    protocol->Stop();
    return 0;
}
