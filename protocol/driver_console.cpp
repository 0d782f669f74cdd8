// The driver's command console for commissioning: acts on the live port,
// queue and framing without staging. Commands it does not know go to the
// framework console.
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "protocol/host_lock.h"
#include "protocol/protocol_xtok.h"
#include "xtokline/text.h"

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
    if (queueCommand(words, reply, size, handled)) {
        return true;
    }
    handled = true;
    for (const Setting& setting : kSettings) {
        if (setting.consoleSetter && cmd == setting.consoleSetter) {
            if (missing) {
                CopyReply("ERROR: new value is missing", reply, size);
                return false;
            }
            return consoleSet(setting, words[1], reply, size);
        }
    }
    handled = false;
    return false;
}

// The queue's commands; `handled` false for any other.
bool Protocol_XTOK::queueCommand(const std::vector<std::string>& words, char* reply, int32_t size,
                                 bool& handled) {
    const std::string& cmd = words[0];
    HostLock lock(queueLock_);
    const std::string* head = tokens_.head();
    handled = true;
    if (cmd == "get") {
        CopyReply(head ? head->c_str() : "", reply, size);
    } else if (cmd == "tokens_available") {
        CopyReply(std::to_string(tokens_.count()).c_str(), reply, size);
    } else if (cmd == "get_token_length") {
        CopyReply(std::to_string(head ? head->size() : 0).c_str(), reply, size);
    } else if (cmd == "token_ack") {
        if (words.size() == 2 && words[1] == "all") {
            tokens_.clear();
        } else {
            tokens_.removeHead();
        }
        CopyReply("OK", reply, size);
    } else {
        handled = false;
    }
    return handled;
}

bool Protocol_XTOK::consoleConnect(const std::vector<std::string>& words, char* reply,
                                   int32_t size) {
    if (words.size() < 2) {
        CopyReply("ERROR: new connect state is missing", reply, size);
        return false;
    }
    if (words[1] != "ON" && words[1] != "OFF") {
        CopyReply("ERROR: wrong value", reply, size);
        return false;
    }
    HostLock lock(queueLock_);
    const bool done = setConnected(words[1] == "ON");
    CopyReply(done ? "OK" : "Can't open serial port", reply, size);
    return true;
}

bool Protocol_XTOK::consolePut(const char* line, char* reply, int32_t size) {
    // The rest of the raw line after "put" and its blanks, blanks inside kept.
    const char* text = std::strstr(line, "put") + 3;
    while (*text == ' ') {
        ++text;
    }
    HostLock lock(queueLock_);
    switch (send(text)) {
        case Sent::NotHex:
            CopyReply("ERROR: token to send must be in hex format", reply, size);
            return false;
        case Sent::NotConnected:
            CopyReply("ERROR: serial port is not active for sending", reply, size);
            return false;
        default:
            CopyReply("OK", reply, size);
            return true;
    }
}

}  // namespace xtok
