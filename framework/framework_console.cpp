// The console every protocol answers through DoCommand, and the information
// text it shows.
#include <algorithm>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "framework/protocol_base.h"
#include "framework/scratch_buffer.h"
#include "module/service_table.h"
#include "xtokline/text.h"

namespace xtok {
namespace {

// "deletetags" is left out on purpose: it is for whoever knows it.
constexpr const char* kHelp =
    "help - displays this message\n"
    "info - displays information about the protocol version\n"
    "xml  - displays the protocol xml description\n"
    "read uri - reads data pointed by uri string\n"
    "write uri hexData - writes data pointed by uri string\n"
    "lasterror - displays the last protocol error\n"
    "getmaxtm - displays the max time for executing a single read/write access\n";

constexpr int32_t kFrameworkVersion = 100;
constexpr int32_t kLibraryVersion = 200;

std::string textOf(const char* text) {
    return text ? text : "";
}

void appendService(std::string& text, IHostService* service) {
    if (service) {
        text += textOf(service->GetName()) + " v." + std::to_string(service->GetVersion()) + "\n";
    }
}

bool hexToBytes(const std::string& hex, std::vector<uint8_t>& bytes) {
    for (std::size_t i = 0; i + 1 < hex.size(); i += 2) {
        int high = hexDigitValue(hex[i]);
        int low = hexDigitValue(hex[i + 1]);
        if (high < 0 || low < 0) {
            return false;
        }
        bytes.push_back(static_cast<uint8_t>(high << 4 | low));
    }
    return true;
}

// Two digits per byte while at least 5 bytes of room are left, then the line
// end and the terminator as far as they fit.
void writeHexReply(const uint8_t* bytes, std::size_t count, char* reply, int32_t size) {
    static const char kDigits[] = "0123456789abcdef";
    int32_t at = 0;
    for (std::size_t i = 0; i < count && size - at >= 5; ++i) {
        reply[at++] = kDigits[bytes[i] >> 4];
        reply[at++] = kDigits[bytes[i] & 0x0F];
    }
    if (at < size) {
        reply[at++] = '\n';
    }
    if (at < size) {
        reply[at] = '\0';
    }
}

}  // namespace

void ProtocolBase::CopyReply(const char* text, char* reply, int32_t size) {
    if (reply && size > 0) {
        std::strncpy(reply, text ? text : "", static_cast<std::size_t>(size));
    }
}

bool ProtocolBase::DoCommand(const char* command, char* reply, int32_t size) {
    return FrameworkCommand(command, reply, size);
}

bool ProtocolBase::FrameworkCommand(const char* command, char* reply, int32_t size) {
    if (!reply) {
        size = 0;
    }
    // Split at every single blank: "read  uri" has an empty second word.
    std::vector<std::string> words;
    splitTrimmed(command ? command : "", ' ', words);
    const std::string& verb = words[0];
    if (verb == "help") {
        CopyReply(kHelp, reply, size);
    } else if (verb == "info") {
        int32_t count = GetInfo(reply, size);
        if (count >= 0 && count < size) {
            reply[count] = '\0';
        }
    } else if (verb == "xml") {
        CopyReply(GetXmlDescription(), reply, size);
    } else if (verb == "lasterror") {
        CopyReply(GetLastErrorText(), reply, size);
    } else if (verb == "read") {
        if (words.size() == 2) {
            ConsoleRead(words[1], reply, size);
        } else {
            CopyReply("error: missing parameter (URI string)\n", reply, size);
        }
    } else if (verb == "write") {
        if (words.size() == 3) {
            ConsoleWrite(words[1], words[2], reply, size);
        } else {
            CopyReply("error: missing parameters (URI string + data)\n", reply, size);
        }
    } else if (verb == "getmaxtm") {
        char text[40];
        std::snprintf(text, sizeof text, "maxtm = %d ms\n", static_cast<int>(GetMaxAccessTime(0)));
        CopyReply(text, reply, size);
    } else if (verb == "deletetags") {
        DeleteAllTags();
    } else {
        return false;
    }
    return true;
}

void ProtocolBase::ConsoleRead(const std::string& uri, char* reply, int32_t size) {
    ITag* tag = CreateTag(uri.c_str());
    if (!tag) {
        CopyReply(GetLastErrorText(), reply, size);
        return;
    }
    ScratchBuffer<64> value(tag->GetSize());
    if (!value.ok()) {
        SetLastError(-1, kNoMemoryText);
    }
    if (value.ok() && ReadTag(tag, value.data())) {
        writeHexReply(value.data(), value.size(), reply, size);
    } else {
        CopyReply(GetLastErrorText(), reply, size);
    }
    DeleteTag(tag);
}

void ProtocolBase::ConsoleWrite(const std::string& uri, const std::string& hex, char* reply,
                                int32_t size) {
    ITag* tag = CreateTag(uri.c_str());
    if (!tag) {
        CopyReply(GetLastErrorText(), reply, size);
        return;
    }
    std::vector<uint8_t> bytes;
    uint8_t none = 0;  // what a tag of size 0 is written from
    const char* answer;
    if (static_cast<int64_t>(hex.size()) != 2 * int64_t{tag->GetSize()}) {
        answer = "error: incorrect length of data to write\n";
    } else if (!hexToBytes(hex, bytes)) {
        answer = "error: incorrect hex data\n";
    } else if (WriteTag(tag, bytes.empty() ? &none : bytes.data())) {
        answer = "written ok\n";
    } else {
        answer = GetLastErrorText();
    }
    CopyReply(answer, reply, size);
    DeleteTag(tag);
}

int32_t ProtocolBase::GetInfo(char* buffer, int32_t size) {
    std::string text = "Protocol: " + textOf(GetName()) + " (" + std::to_string(GetCode()) +
                       ") v." + std::to_string(GetVersion()) + "\n";
    text += "Implementation: " + textOf(GetClassName()) + " v." +
            std::to_string(GetImplementationVersion()) + "\n";
    text += "ProtocolBase v." + std::to_string(kFrameworkVersion) + "\n";
    text += "ProtLib v." + std::to_string(kLibraryVersion) + "\n";
    if (!OmitsServiceInfo() && services_) {
        appendService(text, services_->multiTask);
        appendService(text, services_->serialFactory);
        appendService(text, services_->socketFactory);
    }
    if (!buffer || size <= 0) {
        return 0;
    }
    const int32_t count = static_cast<int32_t>(std::min<std::size_t>(text.size(), size));
    std::memcpy(buffer, text.data(), count);
    if (count < size) {
        buffer[count] = '\0';
    }
    return count;
}

}  // namespace xtok
