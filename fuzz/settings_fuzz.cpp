// Settings an operator writes: "store key text" lines preset retained values
// ("basic" takes the storage without its extended interface), every line is
// then written as "address hexvalue", and SP_Done applies them. SP_Done always
// succeeds and empties the queue, and what it retained a new protocol reads
// back the same after a restart.
#include "fuzz/fuzz_session.h"
#include "protocol/settings.h"

using namespace xtok;
using namespace xtok::fuzz;

namespace {

const std::string kConfig = "rx_prefix=02 rx_suffix=03 token_queue_size=5";

/// Every setting's value; "?" where it cannot be read or is too long to retain.
std::vector<std::string> readSettings(Session& session) {
    // By SettingKind: Number, Byte, Flag, Hex.
    const char* const types[] = {"unsignedInt", "unsignedByte", "boolean", "string-300"};
    std::vector<std::string> values;
    for (const Setting& setting : kSettings) {
        std::string value = session.read(std::string("0?") + setting.memoryType + "?" +
                                         types[static_cast<int>(setting.kind)]);
        value = setting.kind == SettingKind::Hex ? value.c_str() : value;
        values.push_back(value.size() > 255 ? "?" : value);
    }
    return values;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::vector<std::string> input = lines(data, size);
    Session session;
    for (const std::string& line : input) {
        const auto [word, rest] = firstWord(line);
        if (word == "store") {
            session.host.storage().put("XTOK", firstWord(rest).first, firstWord(rest).second);
        }
        session.host.storage().extended = session.host.storage().extended && word != "basic";
    }
    FUZZ_CHECK(session.start(kConfig));
    session.host.serial().feed(
        "\x02"
        "A\x03");
    session.receiveAll();
    for (const std::string& line : input) {
        session.write(firstWord(line).first, hexBytes(firstWord(line).second));
    }
    FUZZ_CHECK(session.write("0?SP_Done?boolean", "\x01"));
    FUZZ_CHECK(session.readInt("tokens_available") == 0);
    ReplyBuffer line(40);
    FUZZ_CHECK(session.protocol->GetSerialSettings(line.data(), line.size()) && line.guardIntact());
    const std::vector<std::string> before = readSettings(session);
    session.protocol->Stop();
    rootObject().factory().DestroyProtocol(session.protocol);
    session.protocol = static_cast<Protocol_XTOK*>(rootObject().factory().CreateProtocol("XTOK"));
    FUZZ_CHECK(session.protocol != nullptr && session.start(kConfig));
    const std::vector<std::string> after = readSettings(session);
    for (std::size_t i = 0; i < before.size(); ++i) {
        FUZZ_CHECK(before[i] == "?" || after[i] == before[i]);
    }
    return 0;
}
