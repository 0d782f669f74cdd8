// The framework console through slot 30, replies compared byte for byte,
// including what lies beyond the reply's size.
#include <gtest/gtest.h>

#include <string>

#include "module/service_table.h"
#include "tests/framework/memory_protocol.h"
#include "tests/support/fake_host.h"
#include "tests/support/slot_call.h"

namespace xtok::test {
namespace {

const std::string kHelp =
    "help - displays this message\n"
    "info - displays information about the protocol version\n"
    "xml  - displays the protocol xml description\n"
    "read uri - reads data pointed by uri string\n"
    "write uri hexData - writes data pointed by uri string\n"
    "lasterror - displays the last protocol error\n"
    "getmaxtm - displays the max time for executing a single read/write access\n";

class Console : public ::testing::Test {
protected:
    // The buffer after the command: `size` bytes of reply and 4 guard bytes,
    // all '#' before the call.
    std::string run(const std::string& command, int32_t size = 512) {
        std::string buffer(size + 4, '#');
        recognised = callSlot<bool>(p, 30, command.c_str(), &buffer[0], size);
        return buffer;
    }
    // `text` as a reply in a buffer of `size`: terminated when it fits.
    static std::string reply(const std::string& text, int32_t size = 512) {
        std::string buffer = text.substr(0, size);
        if (buffer.size() < static_cast<std::size_t>(size)) {
            buffer += std::string(size - buffer.size(), '\0');  // a bounded copy pads
        }
        return buffer + "####";
    }

    MemoryProtocol protocol;
    void* p = static_cast<IProtocol7*>(&protocol);
    bool recognised = false;
};

TEST_F(Console, HelpIsCutAtTheBufferWithoutTerminator) {
    for (int32_t size : {512, 0, 1, 5, 8, static_cast<int32_t>(kHelp.size())}) {
        EXPECT_EQ(run("help", size), reply(kHelp, size)) << size;
        EXPECT_TRUE(recognised);
    }
    EXPECT_EQ(run("help", -3), "#");  // a negative size writes nothing
}

TEST_F(Console, UnknownCommandsLeaveTheReplyAlone) {
    for (const char* command : {"Help", "", " help", "deletetag", "helpx"}) {
        EXPECT_EQ(run(command, 8), std::string(12, '#')) << command;
        EXPECT_FALSE(recognised) << command;
    }
}

TEST_F(Console, ReadPrintsHexWhileFiveBytesOfRoomRemain) {
    const uint8_t data[] = {0x12, 0xAB, 0x00, 0x7F};
    std::copy(data, data + 4, protocol.memory + 8);
    struct Cut {
        int32_t size;
        std::string buffer;
    };
    for (const Cut& c :
         {Cut{16, std::string("12ab007f\n\0######", 16) + "####"},
          Cut{8, std::string("12ab\n\0##", 8) + "####"}, Cut{5, std::string("12\n\0#", 5) + "####"},
          Cut{1, "\n####"}, Cut{0, "####"}}) {
        EXPECT_EQ(run("read bytes?8?byte-4", c.size), c.buffer) << c.size;
        EXPECT_TRUE(recognised);
    }
    EXPECT_TRUE(protocol.Tags().empty());
}

TEST_F(Console, ReadAndWriteRefusals) {
    const std::string missing = "error: missing parameter (URI string)\n";
    const std::string missingData = "error: missing parameters (URI string + data)\n";
    struct Refusal {
        const char* command;
        std::string text;
    };
    for (const Refusal& r : {
             Refusal{"read", missing},
             Refusal{"read a b", missing},
             Refusal{"read  bytes?0?byte", missing},  // two blanks: an empty word
             Refusal{"read bytes?0", "Tag URI error: bytes?0 - 3 fields needed"},
             Refusal{"write bytes?0?byte", missingData},
             Refusal{"write bytes?0?byte 00 00", missingData},
             Refusal{"write bytes?0?byte 0A0B", "error: incorrect length of data to write\n"},
             Refusal{"write bytes?0?byte zz", "error: incorrect hex data\n"},
             Refusal{"write bytes?0?byte-2 0g12", "error: incorrect hex data\n"},
             Refusal{"write bytes?0?short(swap4) 0102", "write conversion error"},
             Refusal{"write bytes?0 00", "Tag URI error: bytes?0 - 3 fields needed"},
         }) {
        EXPECT_EQ(run(r.command), reply(r.text)) << r.command;
        EXPECT_TRUE(recognised);
    }
    EXPECT_EQ(protocol.memory[0], 0);
    protocol.failRawReads = true;
    EXPECT_EQ(run("read bytes?0?byte"), reply("raw read failed"));
    EXPECT_TRUE(protocol.Tags().empty());
}

TEST_F(Console, WriteTakesHexInEitherCase) {
    EXPECT_EQ(run("write bytes?3?byte FF"), reply("written ok\n"));
    EXPECT_EQ(protocol.memory[3], 0xFF);
    EXPECT_EQ(run("write bytes?3?byte-2 a0b1"), reply("written ok\n"));
    EXPECT_EQ(protocol.memory[3], 0xA0);
    EXPECT_EQ(protocol.memory[4], 0xB1);
    EXPECT_EQ(run("write bytes?3?byte-0 "), reply("written ok\n"));  // no bytes at all
    EXPECT_TRUE(protocol.Tags().empty());
}

TEST_F(Console, LastErrorXmlMaxTimeAndDeleteTags) {
    protocol.ReadObject(nullptr, nullptr);
    EXPECT_EQ(run("lasterror"), reply("read object not supported"));
    EXPECT_EQ(run("xml"), reply(""));
    EXPECT_EQ(run("getmaxtm"), reply("maxtm = 12 ms\n"));
    EXPECT_EQ(run("getmaxtm", 5), "maxtm####");

    protocol.CreateTag("bytes?0?byte");
    protocol.CreateTag("bits?0?boolean");
    EXPECT_EQ(run("deletetags", 4), "########");
    EXPECT_TRUE(recognised);
    EXPECT_TRUE(protocol.Tags().empty());
}

// The info text asks only the common slots of a service.
class TaskService : public FakeService<IMultiTask2> {
public:
    using FakeService::FakeService;
    int32_t Reserved4() override { return 0; }
    bool StopTask(ITask*, int32_t) override { return true; }
    IMutex* CreateMutex(int32_t) override { return nullptr; }
    void DestroyMutex(IMutex*) override {}
    void Sleep(int32_t) override {}
    int32_t Reserved9() override { return 0; }
    int32_t Reserved10() override { return 0; }
    int32_t Reserved11() override { return 0; }
    ITask* CreateTask(IRunnable*, int32_t, int32_t) override { return nullptr; }
};

class ConsoleInfo : public Console {
protected:
    void SetUp() override {
        saved = services();
        services().multiTask = &tasks;
        services().serialFactory = nullptr;
        services().socketFactory = &sockets;
    }
    void TearDown() override { services() = saved; }

    ServiceTable saved;
    TaskService tasks{"IMultiTask2", 5};
    FakeService<ISocketFactory> sockets{"ISocketFactory", 9};
};

TEST_F(ConsoleInfo, ListsTheProtocolTheFrameworkAndTheHeldServices) {
    const std::string info =
        "Protocol: MEM (42) v.3\nImplementation: MemoryProtocol v.7\nProtocolBase v.100\n"
        "ProtLib v.200\nIMultiTask2 v.5\nISocketFactory v.9\n";
    // GetInfo terminates and the console stores the same terminator.
    EXPECT_EQ(run("info"), info + '\0' + std::string(512 - info.size() - 1 + 4, '#'));
    EXPECT_EQ(run("info", 10), info.substr(0, 10) + "####");
    char buffer[8];
    EXPECT_EQ(callSlot<int32_t>(p, 25, buffer, int32_t{8}), 8);
    EXPECT_EQ(callSlot<int32_t>(p, 25, buffer, int32_t{0}), 0);
}

}  // namespace
}  // namespace xtok::test
