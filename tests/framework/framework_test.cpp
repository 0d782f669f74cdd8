// The framework as a protocol sees it: data type texts, the named
// conversions, a tag's datum in its memory, the clock, and ProtocolBase
// through a protocol over 16 bytes of memory (the slots a protocol leaves
// alone, the error record, the tag list, reads and writes, the console).
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <string>
#include <vector>

#include "framework/clock.h"
#include "framework/conversions.h"
#include "framework/protocol_base.h"
#include "framework/tag_base.h"
#include "tests/support/slot_call.h"

namespace xtok::test {
namespace {

using namespace std::string_literals;
using P = void*;
using I = int32_t;

// "code/element code/size" and "/name" per conversion, or "refused".
std::string parsed(const std::string& text) {
    DataType t;
    std::string shown = ParseDataType(text, t)
                            ? std::to_string(t.code) + "/" + std::to_string(t.elementCode) + "/" +
                                  std::to_string(t.size)
                            : "refused";
    for (const std::string& name : t.conversions) {
        shown += "/" + name;
    }
    return shown + " ";
}

// The bytes after conversion `name` (direction 0 reads, 1 writes), or
// "refused"; a byte past the datum shows a conversion that overruns it.
std::string conv(const char* type, const char* name, int direction, const std::string& bytes) {
    DataType parsed;
    std::string work = bytes + '|';
    auto* raw = reinterpret_cast<uint8_t*>(&work[0]);
    bool done = ParseDataType(type, parsed) && ApplyConversion(parsed, raw, name, direction);
    return done ? work : "refused";
}

TEST(DataTypes, ParseTheTypeOfATagAddressThenConvertInPlaceOrRefuse) {
    // A dash makes an array; booleans count bits; a length is never negative.
    EXPECT_EQ(parsed(" \tunsignedShort ") + parsed("short-4 ( swap2 ,neg, )") + parsed("byte()") +
                  parsed("boolean-16") + parsed("byte-12abc") + parsed("byte--5"),
              "6/0/2 15/3/8/swap2/neg/ 2/0/1/ 13/1/16 14/2/12 14/2/0 ");
    EXPECT_EQ(parsed("string-1000000") + parsed("short-134217727") + parsed("short-134217728") +
                  parsed("byte)(swap2") + parsed("byte(swap2") + parsed("Byte") +
                  parsed("object-2") + parsed("byte-99999999999999999999"),
              "10/2/1000000 15/3/268435454 refused refused refused refused refused refused ");
    for (int32_t code = 1; code <= 26; ++code) {
        DataType type;
        const std::string name = DataTypeName(code, 24);
        ASSERT_TRUE(ParseDataType(name, type) && type.code == code) << name;
        EXPECT_EQ(DataTypeBit(code), 1u << (code - 1)) << name;
        EXPECT_EQ(ElementSize(code), type.elementCode == 0 ? type.size : 0) << name;
        EXPECT_EQ(IsBitType(code), code == kBoolean || code == kBooleanArray) << name;
    }
    EXPECT_EQ(DataTypeName(15, 8) + DataTypeName(28, 4), "short-4??");
    EXPECT_EQ(DataTypeBit(0) + DataTypeBit(28) + ElementSize(28) + ElementCount(kShort, 8) +
                  ElementCount(28, 8),
              5u);
    EXPECT_EQ(conv("unsignedByte-2", "swapnibble", 1, "\x12\xf0") +
                  conv("short-2", "swap2", 0, "1234") + conv("int-2", "swap4", 1, "12345678"),
              "\x21\x0f|2143|43218765|");
    EXPECT_EQ(conv("byte", "swap2", 0, "1") + conv("byte-0", "swap4", 0, "") +
                  conv("short", "SWAP2", 0, "12"),
              "refused|refused");
    // Binary coded decimal: two digits a byte, the first byte the lowest.
    EXPECT_EQ(conv("short-2", "bcd", 0, "\x34\x12\x78\x56") +
                  conv("int", "bcd", 0, "\x99\x99\x99\x99") + conv("byte", "bcd", 0, "\x1a"),
              "\xd2\x04\x2e\x16|\xff\xe0\xf5\x05|refused"s);
    EXPECT_EQ(conv("short", "bcd", 1, "\xd2\x04"s) + conv("int", "bcd", 1, "\xff\xe0\xf5\x05") +
                  conv("short", "bcd", 1, "\x10\x27") + conv("int64", "bcd", 1, "12345678"),
              "\x34\x12|\x99\x99\x99\x99|refusedrefused");  // 10000 has five digits
    // Only the first ceil(count / width) elements: devices rely on it.
    EXPECT_EQ(conv("byte", "neg", 1, "\x05") + conv("float", "neg", 0, "\0\0\x80\x3f"s) +
                  conv("short-4", "neg", 0, "\0\x01\x02\0\x03\0\x04\0"s),
              "\xfb|\0\0\x80\xbf|\0\xff\xfe\xff\x03\0\x04\0|"s);
    EXPECT_EQ(conv("binary-2", "inv", 1, "\x0f\x01") + conv("boolean-3", "inv", 0, "\0\x01\x07"s) +
                  conv("unsignedShort", "neg", 0, "\x01\0"s) + conv("int", "inv", 0, "1234"),
              "\xf0\xfe|\x01\0\0|refusedrefused"s);
    DataType type;
    EXPECT_FALSE(ParseDataType("short", type) && ApplyConversion(type, nullptr, "swap2", 0));
}

TagBase tagOf(const char* type, int32_t index = 0) {
    TagBase tag;
    EXPECT_TRUE(ParseDataType(type, tag.dataType)) << type;
    tag.index = index;
    return tag;
}

// "byte address/bit offset/raw size " through the tag's slots.
std::string placed(int32_t unitType, int32_t address, int32_t index, const char* type) {
    MemoryType memory;
    memory.naturalType = unitType;
    TagBase tag = tagOf(type, index);
    tag.memoryType = unitType ? &memory : nullptr;
    tag.address = address;
    std::string shown;
    for (int slot : {2, 3, 8}) {
        shown += std::to_string(callSlot<int32_t>(static_cast<ITag*>(&tag), slot)) + "/";
    }
    return shown + " ";
}

TEST(TagBase, ConvertsInListOrderAndPlacesItsDatumInItsMemoryType) {
    TagBase tag = tagOf("short(swap2,neg)");
    std::string raw(2, '?'), value(2, '?');
    ASSERT_TRUE(tag.Convert("\x01\0", &raw[0], 1) && tag.Convert(raw.data(), &value[0], 0));
    EXPECT_EQ(raw + value, "\0\xff\x01\0"s);  // 00 01, then -0x0100; back again
    EXPECT_FALSE(tag.Convert(nullptr, &raw[0], 1) || tag.Convert("\1\0", nullptr, 1));

    TagBase bad = tagOf("short-3(swap2,swap4)");
    std::string untouched(6, '?');
    EXPECT_FALSE(bad.Convert("123456", &untouched[0], 1) || bad.Convert("123456", nullptr, 0));
    EXPECT_EQ(bad.errorText + untouched, "Conversion error at: swap4??????");

    TagBase bits = tagOf("boolean-3(inv)", 6);  // bits 6, 7 and 8
    std::string three(3, '?'), back = "\0\xff"s;
    ASSERT_TRUE(bits.Convert("\x40\x01", &three[0], 0) && bits.Convert("\0\0\x01", &back[0], 1));
    EXPECT_EQ(three + back, "\0\x01\0\xc0\xfe"s);  // only the tag's own bits change

    const int32_t word = kUnsignedShort, bit = kBoolean;  // the unit of the memory type
    // Bit 13 of word 2; bits of a bit memory; array index times element size.
    EXPECT_EQ(placed(word, 2, 13, "boolean") + placed(bit, 13, 0, "boolean") +
                  placed(bit, 4, 0, "boolean-8") + placed(bit, 0, 0, "boolean-8") +
                  placed(bit, 2, 0, "byte") + placed(kByte, 0, 3, "short-4") +
                  placed(word, 3, 1, "int") + placed(kByte, 0, -3, "boolean") +
                  placed(0, 3, 0, "short"),
              "5/5/1/ 1/5/1/ 0/4/2/ 0/0/1/ 2/2/1/ 6/3/8/ 10/1/4/ 0/5/1/ 3/0/2/ ");
}

// "year-month-day weekday hh:mm:ss.mmm" when the stamp converts back to itself.
std::string brokenDown(int64_t stamp) {
    SystemTime t;
    int64_t back = -1;
    char text[64] = "refused";
    if (StampToSystemTime(stamp, t) && SystemTimeToStamp(t, back) && back == stamp) {
        std::snprintf(text, sizeof text, "%04d-%02d-%02d %d %02d:%02d:%02d.%03d", t.year, t.month,
                      t.day, t.dayOfWeek, t.hour, t.minute, t.second, t.milliseconds);
    }
    return text + " "s;
}

TEST(Clock, StampsAndBrokenDownTimesBothWays) {
    EXPECT_EQ(brokenDown(-1) + brokenDown(951782400000 + 3723004),
              "1969-12-31 3 23:59:59.999 2000-02-29 2 01:02:03.004 ");
    EXPECT_EQ(brokenDown(-kFileTimeEpochOffsetMs) + brokenDown(253402300799999),
              "1601-01-01 1 00:00:00.000 9999-12-31 5 23:59:59.999 ");
    EXPECT_EQ(brokenDown(-kFileTimeEpochOffsetMs - 1) + brokenDown(INT64_MAX), "refused refused ");
    int64_t stamp = -1;
    EXPECT_TRUE(SystemTimeToStamp({30827, 12, 0, 31, 23, 59, 59, 999}, stamp));  // the last one
    // Each field out of range.
    EXPECT_FALSE(
        SystemTimeToStamp({2001, 2, 0, 29}, stamp) || SystemTimeToStamp({2000, 13, 0, 1}, stamp) ||
        SystemTimeToStamp({2000, 12, 0, 32}, stamp) ||
        SystemTimeToStamp({1600, 12, 0, 31}, stamp) || SystemTimeToStamp({30828, 1, 0, 1}, stamp) ||
        SystemTimeToStamp({2000, 1, 0, 1, 24}, stamp) ||
        SystemTimeToStamp({2000, 1, 0, 1, 0, 0, 0, 1000}, stamp));
    // The zone's offset as the C library has it: now's UTC fields read as a local time.
    const std::time_t now = std::time(nullptr);
    std::tm utc = *std::gmtime(&now);
    utc.tm_isdst = -1;
    EXPECT_EQ(LocalOffset(), (now - std::mktime(&utc)) * 1000);
    EXPECT_EQ(ToUtc(ToLocal(1000)) * 10 + ToLocal(0) + ToUtc(0), 10000);  // no time stays none
}

const char* const kFieldNames[] = {"address", "datatype", nullptr};

// Tag addresses read "byte[.bit]?datatype". A failed access leaves the error
// record to the framework.
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
    const char* const* GetUriFieldNames() override { return kFieldNames; }
    // An empty address stands for a tag that cannot be allocated.
    ITag* NewTag(const char* uri) override {
        const char* type = std::strchr(uri, '?');
        TagBase* tag = *uri ? new TagBase : nullptr;
        if (tag) {
            tag->uri = uri;
            tag->valid = type && std::sscanf(uri, "%d.%d", &tag->address, &tag->index) > 0 &&
                         ParseDataType(type + 1, tag->dataType);
        }
        return AdoptNewTag(tag);
    }
    bool ReadTagRaw(ITag* t, void* b, int32_t n) override {
        return !failReads && std::memcpy(b, at(t), n);
    }
    bool WriteTag(ITag* t, const void* v) override { return t->Convert(v, at(t), 1); }
    char* at(ITag* t) { return memory + t->GetByteAddress(); }

    char memory[16] = {};
    bool failReads = false;
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
    {call<bool, P, I, P>, 0, "", {17, 32}},
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
            EXPECT_EQ(std::to_string(protocol.GetLastErrorCode()) + protocol.GetLastErrorText(),
                      *d.error ? "-1"s + d.error : "1")
                << slot;
        }
    }
}

class ProtocolBaseTest : public ::testing::Test {
protected:
    std::string error() {
        return std::to_string(protocol.GetLastErrorCode()) + " " + protocol.GetLastErrorText();
    }
    ITag* tag(const char* uri) { return protocol.CreateTag(uri); }
    // The console through slot 30: the buffer after the command, `size` bytes
    // of reply and 4 guard bytes, all '#' before; "-" when not recognised.
    std::string run(const std::string& command, int32_t size = 64) {
        std::string buffer(std::max(size, 0) + 4, '#');
        void* self = static_cast<IProtocol7*>(&protocol);
        return callSlot<bool>(self, 30, command.c_str(), &buffer[0], size) ? buffer : "-";
    }
    // `text` as a reply in 64 bytes: a bounded copy pads with zeros.
    static std::string reply(const std::string& text) {
        return text + std::string(64 - text.size(), '\0') + "####";
    }
    Memory protocol;
};

TEST_F(ProtocolBaseTest, AnswersItsNamesKeepsOrdersAndSplitsItsTags) {
    EXPECT_EQ(protocol.GetInterface("IProtocol4"), static_cast<IProtocol7*>(&protocol));
    EXPECT_FALSE(protocol.GetInterface("IProtocol8") || protocol.GetInterface(nullptr));
    protocol.SetInstanceName("");  // no instance name: the protocol's
    EXPECT_EQ(protocol.GetInstanceName() + "/"s + protocol.GetNameFor(5, 6), "MEM/MEM");

    ITag* kept = tag("1?byte");
    EXPECT_EQ(tag("") ? "made" : error(), "0 Can't allocate Tag");
    EXPECT_EQ(protocol.Tags(), std::list<ITag*>{kept});
    protocol.DeleteTag(kept);
    protocol.DeleteTag(nullptr);
    EXPECT_TRUE(protocol.Tags().empty());
    ITag* first = tag("0?short");
    ITag* second = tag("2?short");
    ITag* bits = tag("0?boolean-3");
    // TagFollows(a, b): whether b lies immediately before a.
    EXPECT_EQ(
        std::vector<bool>({protocol.TagLess(first, second), protocol.TagLess(second, first),
                           protocol.TagFollows(second, first), protocol.TagFollows(first, second),
                           protocol.TagFollows(tag("0.3?boolean"), bits),
                           protocol.TagFollows(tag("0.4?boolean"), bits)}),
        std::vector<bool>({1, 0, 1, 0, 1, 0}));
    std::string fields;
    for (int32_t index : {0, 1, 2, -1}) {
        int32_t length = -7;
        const char* name = protocol.GetUriFieldName(index);
        const char* text = protocol.GetUriField(first, index, &length);
        fields +=
            (name ? name : "-") + " "s + (text ? text : "-") + " " + std::to_string(length) + ",";
    }
    EXPECT_EQ(fields, "address 0?short 1,datatype short 5,- - -7,- - -7,");
    EXPECT_EQ(protocol.GetUriFieldCount() * 10 + protocol.GetUriFieldIndex("datatype"), 21);
    EXPECT_EQ(protocol.GetUriFieldIndex("Address") + protocol.GetUriFieldIndex(nullptr), -2);
}

TEST_F(ProtocolBaseTest, ReadsConvertStampAfterASuccessAndRewriteWholeArrays) {
    protocol.WriteObject(nullptr, nullptr);
    std::memcpy(protocol.memory + 4, "\x78\x56\x34\x12", 4);
    int32_t value = 0;
    int64_t stamps[3] = {-5, -5, -5};
    const int64_t before = static_cast<int64_t>(std::time(nullptr)) * 1000;  // the system time
    EXPECT_TRUE(protocol.ReadTagRawStamped(tag("0?int"), &value, 4, &stamps[1]) &&
                protocol.ReadTagStamped(tag("4?int(swap4)"), &value, &stamps[0]));
    EXPECT_TRUE(std::min(stamps[0], stamps[1]) >= before && stamps[0] < before + 2000);
    // 0x78563412, and a success clears no error.
    EXPECT_EQ(std::to_string(value) + error(), "2018915346-1 write object not supported");
    EXPECT_FALSE(protocol.ReadTag(tag("4?short(swap4)"), &value));
    EXPECT_EQ(error(), "-9 read conversion error");
    ITag* array = tag("4?short-4");
    int16_t item = 0x0102;
    EXPECT_FALSE(protocol.ReadArrayItem(tag("0?short"), 0, &item));
    EXPECT_EQ(error(), "-1 accessing an array item where the tag is not array");
    EXPECT_FALSE(protocol.WriteArrayItem(array, 4, &item) ||
                 protocol.ReadArrayItem(array, -1, &item));
    EXPECT_EQ(error(), "-1 accessing array item out of range");
    // An item is written by rewriting the whole array.
    EXPECT_TRUE(protocol.WriteArrayItem(array, 3, &item) &&
                protocol.ReadArrayItem(array, 0, &item));
    EXPECT_EQ(std::string(protocol.memory + 4, 8) + std::to_string(item),
              "\x78\x56\x34\x12\0\0\x02\x01"s + std::to_string(0x5678));
    protocol.failReads = true;
    stamps[0] = stamps[1] = -5;
    EXPECT_FALSE(protocol.ReadTagStamped(tag("0?int"), &value, &stamps[0]) ||
                 protocol.ReadTagRawStamped(tag("0?int"), &value, 4, &stamps[1]) ||
                 protocol.ReadOptimizedStamped(tag("0?int"), &value, 32, &stamps[2]));
    EXPECT_EQ(stamps[0] + stamps[1] + stamps[2], -15);
}

TEST_F(ProtocolBaseTest, ConsoleRepliesAreCutAtTheBufferWithoutTerminator) {
    EXPECT_EQ(run("help", 5) + run("help", -3) + run("Help") + run("helpx"), "help ########--");
    protocol.ReadObject(nullptr, nullptr);
    EXPECT_EQ(run("lasterror") + run("xml"), reply("read object not supported") + reply(""));
    tag("0?byte");
    EXPECT_EQ(run("deletetags", 4), "########");
    EXPECT_TRUE(protocol.Tags().empty());

    EXPECT_EQ(run("info", 10) + std::to_string(protocol.GetInfo(nullptr, 8)), "Protocol: ####0");
    std::memcpy(protocol.memory + 8, "\x12\xAB\x00\x7F", 4);
    // Two digits a byte while 5 bytes of room are left, then what fits of "\n\0".
    EXPECT_EQ(run("read 8?byte-4", 16) + run("read 8?byte-4", 8),
              "12ab007f\n\0##########12ab\n\0######"s);
    EXPECT_EQ(run("read 8?byte-4", 5) + run("read 8?byte-4", 1) + run("read 8?byte-4", 0),
              "12\n\0#####\n########"s);
    for (auto [command, text] :
         {std::pair<const char*, std::string>{"read", "error: missing parameter (URI string)\n"},
          {"read 0", "Tag URI error: 0 - "},
          {"write 0?byte", "error: missing parameters (URI string + data)\n"},
          {"write 0?byte 0A0B", "error: incorrect length of data to write\n"},
          {"write 0?byte-2 0g12", "error: incorrect hex data\n"},
          {"write 3?byte-3 a9F0fA", "written ok\n"}}) {
        EXPECT_EQ(run(command), reply(text)) << command;
    }
    protocol.failReads = true;
    EXPECT_EQ(run("read 0?byte"), reply("Tag URI error: 0 - "));
    EXPECT_EQ(std::string(protocol.memory, 6) + std::to_string(protocol.Tags().size()),
              "\0\0\0\xa9\xf0\xfa"s + "0");
}

}  // namespace
}  // namespace xtok::test
