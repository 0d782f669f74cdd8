// ProtocolBase through a protocol over 16 bytes of memory: the slots a
// protocol leaves alone, the error record, the tag list, reads and writes,
// and the framework console.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "framework/clock.h"
#include "framework/protocol_base.h"
#include "framework/tag_base.h"
#include "module/service_table.h"
#include "tests/support/module_session.h"
#include "tests/support/slot_call.h"

namespace xtok::test {
namespace {

using namespace std::string_literals;
using P = void*;
using I = int32_t;

int liveTags = 0;

struct LiveTag : TagBase {
    LiveTag() { ++liveTags; }
    ~LiveTag() override { --liveTags; }
};

// Tag addresses read "byte[.bit]?datatype".
class Memory : public ProtocolBase {
public:
    const char* GetClassName() override { return "Memory"; }
    int32_t GetImplementationVersion() override { return 7; }
    bool Configure(const char*) override { return true; }
    bool CanJoinTags(ITag*, ITag*, int32_t) override { return false; }
    const char* GetName() override { return "MEM"; }
    int32_t GetVersion() override { return 3; }
    int32_t GetCode() override { return 42; }
    const char* GetDisplayName() override { return ""; }
    int32_t GetTagProperty(ITag*) override { return 0; }
    int32_t GetMaxAccessTime(int32_t) override { return 12; }
    const char* const* GetUriFieldNames() override {
        static const char* const kNames[] = {"address", "datatype", nullptr};
        return kNames;
    }
    ITag* NewTag(const char* uri) override {
        TagBase* tag = refuseTags ? nullptr : new LiveTag;
        const char* type = std::strchr(uri, '?');
        if (tag) {
            tag->uri = uri;
            tag->memoryType = &bytes_;
            tag->valid = type && std::sscanf(uri, "%d.%d", &tag->address, &tag->index) > 0 &&
                         ParseDataType(type + 1, tag->dataType);
        }
        return AdoptNewTag(tag);
    }
    // A failed access leaves the error record to the caller.
    bool ReadTagRaw(ITag* tag, void* buffer, int32_t size) override {
        std::memcpy(buffer, memory + tag->GetByteAddress(), size);
        return !failReads;
    }
    bool WriteTag(ITag* tag, const void* value) override {
        return tag->Convert(value, memory + tag->GetByteAddress(), 1);
    }

    char memory[16] = {};
    bool failReads = false;
    bool refuseTags = false;

private:
    MemoryType bytes_;
};

// Calls `slot` with null pointers and zeros.
template <class R, class... A>
int64_t call(void* p, int slot) {
    return callSlot<R>(p, slot, A{}...);
}

struct Default {
    int64_t (*call)(void*, int);
    int64_t result;
    const char* error;  // "": the error record keeps its first state
    std::vector<int> slots;
};

const Default kDefaults[] = {
    {call<bool>, 1, "", {8, 9}},
    {call<bool>, 0, "", {27}},
    {call<I>, 0, "", {34, 35, 36, 37, 41, 45, 46, 47, 48, 49, 50, 53, 55, 61, 65, 66, 69, 70}},
    {call<I>, 0xFFFFFF, "", {42}},
    {call<I, P>, 0, "", {14, 15}},
    {call<bool, P>, 0, "", {39}},
    {call<bool, P, P>, 0, "", {16}},
    {call<bool, P, I>, 0, "", {54}},
    {call<bool, P, I, P>, 0, "", {17}},
    {call<bool, P, P, I>, 0, "", {40}},
    {call<I, I, P>, 0, "", {31}},
    {call<bool, P, P>, 0, "Optimized writing not supported", {13}},
    {call<bool, P, P>, 0, "read object not supported", {51}},
    {call<bool, P, P>, 0, "write object not supported", {52}},
    {call<bool, P, P>, 0, "protocol does not support event channel", {56, 57, 59, 60}},
    {call<bool, P, P>, 0, "protocol does not support alarms", {63}},
    {call<bool, P, P>, 0, "protocol does not support trends", {67}},
};

TEST(ProtocolDefaults, EachSlotAnswersAndRecordsAsDocumented) {
    for (const Default& d : kDefaults) {
        for (int slot : d.slots) {
            Memory protocol;
            EXPECT_EQ(d.call(static_cast<IProtocol7*>(&protocol), slot), d.result) << slot;
            EXPECT_EQ(protocol.GetLastErrorCode(), *d.error ? -1 : 1) << slot;
            EXPECT_STREQ(protocol.GetLastErrorText(), d.error) << slot;
        }
    }
}

class Base : public ::testing::Test {
protected:
    std::string error() {
        return std::to_string(protocol.GetLastErrorCode()) + " " + protocol.GetLastErrorText();
    }
    ITag* tag(const char* uri) { return protocol.CreateTag(uri); }
    Memory protocol;
};

TEST_F(Base, AnswersItsNamesAndKeepsItsTags) {
    for (const char* name : {"ProtocolBase", "IProtocol7", "IProtocol6", "IProtocol5", "IProtocol4",
                             "IProtocol3", "IProtocol2", "IProtocol"}) {
        EXPECT_EQ(protocol.GetInterface(name), static_cast<IProtocol7*>(&protocol)) << name;
    }
    EXPECT_FALSE(protocol.GetInterface("IProtocol8") || protocol.GetInterface("iprotocol") ||
                 protocol.GetInterface("") || protocol.GetInterface(nullptr));
    std::string names = protocol.GetInstanceName();  // without one, the protocol's name
    for (const char* name : {"line2", ""}) {
        protocol.SetInstanceName(name);
        names = names + "," + protocol.GetInstanceName();
    }
    EXPECT_EQ(names + "," + protocol.GetNameFor(5, 6), "MEM,line2,MEM,MEM");

    ITag* kept = tag("1?byte");
    protocol.refuseTags = true;
    EXPECT_EQ(tag("1?byte"), nullptr);
    EXPECT_EQ(error(), "0 Can't allocate Tag");
    EXPECT_EQ(protocol.Tags(), std::list<ITag*>{kept});
    protocol.DeleteTag(kept);
    protocol.DeleteTag(nullptr);
    EXPECT_EQ(protocol.Tags().size() + liveTags, 0u);
    auto* owned = new Memory;
    owned->CreateTag("0?byte");
    void* ownedSlots = static_cast<IProtocol7*>(owned);
    EXPECT_EQ(callSlot<void*>(ownedSlots, 0, 1u), ownedSlots);
    EXPECT_EQ(liveTags, 0);  // the protocol's end takes its tags along
}

TEST_F(Base, ReadsConvertedValuesStampedAfterASuccessOnly) {
    EXPECT_EQ(error(), "1 ");
    protocol.WriteObject(nullptr, nullptr);
    std::memcpy(protocol.memory + 4, "\x78\x56\x34\x12", 4);
    int32_t value = 0;
    int64_t stamps[3] = {-5, -5, -5};
    const int64_t before = NowStamp();
    EXPECT_TRUE(protocol.ReadTagRawStamped(tag("0?int"), &value, 4, &stamps[1]));
    EXPECT_TRUE(protocol.ReadTagStamped(tag("4?int(swap4)"), &value, &stamps[0]));
    EXPECT_TRUE(std::min(stamps[0], stamps[1]) >= before && stamps[0] <= NowStamp());
    EXPECT_EQ(value, 0x78563412);
    EXPECT_EQ(error(), "-1 write object not supported");  // a success clears nothing
    EXPECT_FALSE(protocol.ReadTag(tag("4?short(swap4)"), &value));
    EXPECT_EQ(error(), "-9 read conversion error");

    protocol.failReads = true;
    stamps[0] = stamps[1] = -5;
    EXPECT_FALSE(protocol.ReadTagStamped(tag("0?int"), &value, &stamps[0]) ||
                 protocol.ReadTagRawStamped(tag("0?int"), &value, 4, &stamps[1]) ||
                 protocol.ReadOptimizedStamped(tag("0?int"), &value, 32, &stamps[2]));
    EXPECT_EQ(stamps[0] + stamps[1] + stamps[2], -15);
    EXPECT_EQ(error(), "-9 read conversion error");
}

TEST_F(Base, ArrayItemsAreCheckedThenReadOrRewritten) {
    ITag* array = tag("4?short-4");
    int16_t item = 0x0102;
    EXPECT_FALSE(protocol.ReadArrayItem(tag("0?short"), 0, &item));
    EXPECT_EQ(error(), "-1 accessing an array item where the tag is not array");
    EXPECT_FALSE(protocol.WriteArrayItem(array, 4, &item) ||
                 protocol.ReadArrayItem(array, -1, &item));
    EXPECT_EQ(error(), "-1 accessing array item out of range");
    std::memcpy(protocol.memory + 4, "\x78\x56\x34\x12", 4);
    EXPECT_TRUE(protocol.WriteArrayItem(array, 3, &item) &&
                protocol.ReadArrayItem(array, 1, &item));
    EXPECT_EQ(std::string(protocol.memory + 4, 8) + std::to_string(item),
              "\x78\x56\x34\x12\0\0\x02\x01"s + std::to_string(0x1234));
}

// Reads up to 3 tags of 6 bytes together.
class Blocks : public Memory {
    int32_t GetMaxTagsPerBlock(ITag*) override { return 3; }
    int32_t GetMaxBytesPerBlock(ITag*) override { return 6; }
    bool CanJoinBlock(ITag*, ITag*) override { return true; }
    bool ReadBlockRaw(ITag*, int32_t, void*) override { return true; }
};

TEST(ProtocolBlocks, MultipleReadsRespectTheLimitsAndStampAlike) {
    Blocks protocol;
    ITag* tags[] = {protocol.CreateTag("0?short"), protocol.CreateTag("2?short"),
                    protocol.CreateTag("4?short"), protocol.CreateTag("6?int")};
    std::string answers;  // 3 tags of 6 bytes fit; 4 tags, 8 bytes or none do not
    for (auto [first, count] : {std::pair{0, 2}, {0, 3}, {3, 2}, {0, 0}, {1, 1}}) {
        answers += protocol.CanReadMultiple(tags, count, tags[first]) ? '1' : '0';
    }
    int32_t status[4] = {};
    int64_t stamps[4] = {};
    EXPECT_TRUE(protocol.ReadMultipleStamped(tags[0], 3, protocol.memory, status, stamps));
    EXPECT_EQ(
        answers + std::to_string(status[0]) + std::to_string(status[2]) + std::to_string(status[3]),
        "10001110");
    EXPECT_TRUE(stamps[0] > 0 && stamps[2] == stamps[0] && stamps[3] == 0);
}

TEST_F(Base, OrdersTagsAndFindsTheirAddressFields) {
    ITag* first = tag("0?short");
    ITag* second = tag("2?short");
    ITag* bits = tag("0?boolean-3");
    std::string answers;  // TagFollows(a, b): whether b lies immediately before a
    for (bool answer : {protocol.TagLess(first, second), protocol.TagLess(second, first),
                        protocol.TagFollows(second, first), protocol.TagFollows(first, second),
                        protocol.TagFollows(tag("0.3?boolean"), bits),
                        protocol.TagFollows(tag("0.4?boolean"), bits)}) {
        answers += answer ? '1' : '0';
    }
    EXPECT_EQ(answers, "101010");
    std::string fields;
    for (int32_t index : {0, 1, 2, -1}) {
        int32_t length = -7;
        const char* name = protocol.GetUriFieldName(index);
        const char* text = protocol.GetUriField(first, index, &length);
        fields += std::string(name ? name : "-") + " " + (text ? text : "-") + " " +
                  std::to_string(length) + ", ";
    }
    EXPECT_EQ(fields, "address 0?short 1, datatype short 5, - - -7, - - -7, ");
    EXPECT_EQ(protocol.GetUriFieldCount() * 10 + protocol.GetUriFieldIndex("datatype"), 21);
    EXPECT_EQ(protocol.GetUriFieldIndex("Address") + protocol.GetUriFieldIndex(nullptr), -2);
    EXPECT_EQ(protocol.ProtocolBase::GetUriFieldNames()[0], nullptr);
}

// The console through slot 30: the buffer after the command, `size` bytes of
// reply and 4 guard bytes, all '#' before; "(not mine)" when not recognised.
class Console : public Base {
protected:
    std::string run(const std::string& command, int32_t size = 64) {
        std::string buffer(std::max(size, 0) + 4, '#');
        void* self = static_cast<IProtocol7*>(&protocol);
        return callSlot<bool>(self, 30, command.c_str(), &buffer[0], size) ? buffer : "(not mine)";
    }
    // `text` as a reply in 64 bytes: a bounded copy pads with zeros.
    static std::string reply(const std::string& text) {
        return text + std::string(64 - text.size(), '\0') + "####";
    }
};

TEST_F(Console, FixedRepliesAreCutAtTheBufferWithoutTerminator) {
    EXPECT_EQ(run("help", 5) + run("help", 0) + run("help", -3), "help ############");
    for (const char* command : {"Help", "", " help", "deletetag", "helpx"}) {
        EXPECT_EQ(run(command), "(not mine)") << command;
    }
    protocol.ReadObject(nullptr, nullptr);
    EXPECT_EQ(run("lasterror") + run("xml"), reply("read object not supported") + reply(""));
    EXPECT_EQ(run("getmaxtm") + run("getmaxtm", 5), reply("maxtm = 12 ms\n") + "maxtm####");
    tag("0?byte");
    EXPECT_EQ(run("deletetags", 4), "########");
    EXPECT_EQ(protocol.Tags().size() + liveTags, 0u);

    FakeHost host;
    ModuleSession session(host);
    std::string info =
        "Protocol: MEM (42) v.3\nImplementation: Memory v.7\nProtocolBase v.100\nProtLib v.200\n";
    for (IHostService* service : std::vector<IHostService*>{
             services().multiTask, services().serialFactory, services().socketFactory}) {
        info += service->GetName() + " v."s + std::to_string(service->GetVersion()) + "\n";
    }
    EXPECT_EQ(run("info", 400), info + '\0' + std::string(400 - info.size() - 1 + 4, '#'));
    EXPECT_EQ(run("info", 10), info.substr(0, 10) + "####");
}

TEST_F(Console, ReadsAndWritesHexOrExplains) {
    std::memcpy(protocol.memory + 8, "\x12\xAB\x00\x7F", 4);
    // Two digits a byte while 5 bytes of room are left, then what fits of "\n\0".
    EXPECT_EQ(run("read 8?byte-4", 16) + run("read 8?byte-4", 8),
              "12ab007f\n\0##########12ab\n\0######"s);
    EXPECT_EQ(run("read 8?byte-4", 5) + run("read 8?byte-4", 1) + run("read 8?byte-4", 0),
              "12\n\0#####\n########"s);
    const std::string missing = "error: missing parameter (URI string)\n";
    const std::string missingData = "error: missing parameters (URI string + data)\n";
    for (auto [command, text] :
         {std::pair<const char*, std::string>{"read", missing},
          {"read  0?byte", missing},  // two blanks: an empty word
          {"read 0", "Tag URI error: 0 - "},
          {"write 0?byte", missingData},
          {"write 0?byte 00 00", missingData},
          {"write 0?byte 0A0B", "error: incorrect length of data to write\n"},
          {"write 0?byte-2 0g12", "error: incorrect hex data\n"},
          {"write 0?short(swap4) 0102", "Tag URI error: 0 - "},  // the last error
          {"write 3?byte-2 a0B1", "written ok\n"},
          {"write 3?byte-0 ", "written ok\n"}}) {
        EXPECT_EQ(run(command), reply(text)) << command;
    }
    protocol.failReads = true;
    EXPECT_EQ(run("read 0?byte"), reply("Tag URI error: 0 - "));
    EXPECT_EQ(std::string(protocol.memory, 5) + std::to_string(liveTags), "\0\0\0\xa0\xb1"s + "0");
}

}  // namespace
}  // namespace xtok::test
