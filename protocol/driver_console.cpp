// The driver's command console for commissioning: acts on the live port,
// queue and framing without staging. Commands it does not know go to the
// framework console.
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "params/text.h"
#include "protocol/hex_text.h"
#include "protocol/host_lock.h"
#include "protocol/protocol_xtok.h"

namespace xtok {

namespace {

const char kDriverHelp[] =
    "connect cmd - set connect ON or OFF\n"
    "get_stat - get status of connection\n"
    "put str - put the token to send\n"
    "get - get the received token\n"
    "get_token_length - get the length of the received token\n"
    "tokens_available - get number of tokens received\n"
    "token_ack - acknowledge reading token - \"token_ack all\" clears the queue\n"
    "set_hexToken ON/OFF - set the hexToken mode\n"
    "set_rxGap value - set the rx gap in ms\n"
    "set_rxPrefix string - set the rx prefix\n"
    "set_rxSuffix string - set the rx suffix\n"
    "set_txPrefix string - set the tx prefix\n"
    "set_txSuffix string - set the tx suffix\n";

// Base-10 number at the start of `word`; false when no character was used.
bool parseDecimal(const std::string& word, int32_t& out) {
    const char* begin = word.c_str();
    char* end = nullptr;
    int saved = errno;
    long long value = std::strtoll(begin, &end, 10);
    errno = saved;
    if (end == begin) {
        return false;
    }
    out = static_cast<int32_t>(value > INT32_MAX   ? INT32_MAX
                               : value < INT32_MIN ? INT32_MIN
                                                   : value);
    return true;
}

}  // namespace

bool Protocol_XTOK::DoCommand(const char* command, char* reply, int32_t size) {
    std::string line = command ? command : "";
    std::vector<std::string> words;
    splitTrimmed(line, ' ', words);
    bool handled = false;
    bool result = driverCommand(words, line.c_str(), reply, size, handled);
    return handled ? result : FrameworkCommand(line.c_str(), reply, size);
}

bool Protocol_XTOK::driverCommand(const std::vector<std::string>& words, const char* line,
                                  char* reply, int32_t size, bool& handled) {
    handled = true;
    const std::string& cmd = words[0];
    const bool missing = words.size() < 2;
    if (cmd == "help") {
        // Without a buffer there is no framework text to step past.
        if (FrameworkCommand(line, reply, size) && reply && size > 0) {
            std::size_t used = strnlen(reply, static_cast<std::size_t>(size));
            reply += used;
            size -= static_cast<int32_t>(used);
        }
        CopyReply(kDriverHelp, reply, size);
        return true;
    }
    if (cmd == "connect") {
        return consoleConnect(words, reply, size);
    }
    if (cmd == "get_stat") {
        CopyReply(connected_ ? "Connected" : "Disconnected", reply, size);
        return true;
    }
    if (cmd == "put") {
        if (missing) {
            CopyReply("ERROR: string to send is missing", reply, size);
            return false;
        }
        return consolePut(line, reply, size);
    }
    // The queue commands take no queueLock: a console for commissioning,
    // where the runtime is not reading tokens at the same time. The receive
    // task may push meanwhile; the queue guards itself against that.
    if (cmd == "get") {
        tokens_.withHead(
            [&](const std::string* head) { CopyReply(head ? head->c_str() : "", reply, size); });
        return true;
    }
    if (cmd == "tokens_available") {
        CopyReply(std::to_string(tokens_.count()).c_str(), reply, size);
        return true;
    }
    if (cmd == "get_token_length") {
        const std::size_t length =
            tokens_.withHead([](const std::string* head) { return head ? head->size() : 0; });
        CopyReply(std::to_string(length).c_str(), reply, size);
        return true;
    }
    if (cmd == "token_ack") {
        if (words.size() == 2 && words[1] == "all") {
            tokens_.clear();
        } else {
            tokens_.removeHead();
        }
        CopyReply("OK", reply, size);
        return true;
    }
    if (cmd == "set_hexToken" || cmd == "set_rxGap" || cmd == "set_rxPrefix" ||
        cmd == "set_rxSuffix" || cmd == "set_txPrefix" || cmd == "set_txSuffix") {
        if (missing) {
            CopyReply("ERROR: new value is missing", reply, size);
            return false;
        }
        return consoleSet(cmd, words[1], reply, size);
    }
    handled = false;
    return false;
}

bool Protocol_XTOK::consoleSet(const std::string& cmd, const std::string& value, char* reply,
                               int32_t size) {
    const char* answer = "OK";
    if (cmd == "set_hexToken") {
        if (value == "ON" || value == "OFF") {
            hexTokens_ = value == "ON";
        } else {
            answer = "ERROR: wrong value";
        }
    } else if (cmd == "set_rxGap") {
        int32_t gap = 0;
        if (parseDecimal(value, gap)) {
            gap_ = gap;
        } else {
            answer = "ERROR: wrong value";
        }
    } else {
        // Stored as typed: a text that is not hex converts leniently when used.
        SharedText& text = cmd == "set_rxPrefix"   ? rxPrefix_
                           : cmd == "set_rxSuffix" ? rxSuffix_
                           : cmd == "set_txPrefix" ? txPrefix_
                                                   : txSuffix_;
        text.set(value);
    }
    // "ERROR: wrong value" still answers true here, unlike "connect".
    CopyReply(answer, reply, size);
    return true;
}

bool Protocol_XTOK::consoleConnect(const std::vector<std::string>& words, char* reply,
                                   int32_t size) {
    if (words.size() < 2) {
        CopyReply("ERROR: new connect state is missing", reply, size);
        return false;
    }
    if (words[1] == "OFF") {
        if (connected_) {
            connected_ = false;
            HostLock lock(portLock_);
            port_.Close();
        }
        CopyReply("OK", reply, size);
        return true;
    }
    if (words[1] != "ON") {
        CopyReply("ERROR: wrong value", reply, size);
        return false;
    }
    bool opened = true;
    {
        HostLock lock(portLock_);
        if (!connected_) {
            opened = openPort();
            connected_ = opened;
        }
    }
    CopyReply(opened ? "OK" : "Can't open serial port", reply, size);
    return true;
}

bool Protocol_XTOK::consolePut(const char* line, char* reply, int32_t size) {
    // The rest of the raw line after "put" and its blanks, blanks inside kept.
    const char* text = std::strstr(line, "put") + 3;
    while (*text == ' ') {
        ++text;
    }
    const bool hex = hexTokens_;
    if (hex && !isHexText(text)) {
        CopyReply("ERROR: token to send must be in hex format", reply, size);
        return false;
    }
    if (!connected_) {
        CopyReply("ERROR: serial port is not active for sending", reply, size);
        return false;
    }
    std::string frame = hexTextToBytes(txPrefix_.get());
    frame += hex ? hexTextToBytes(text) : std::string(text);
    frame += hexTextToBytes(txSuffix_.get());
    port_.Write(frame);
    CopyReply("OK", reply, size);
    return true;
}

}  // namespace xtok
