// ProtocolBase reached as a runtime reaches it: by slot number.
#include <gtest/gtest.h>

#include <cstring>
#include <new>
#include <string>

#include "framework/clock.h"
#include "tests/framework/memory_protocol.h"
#include "tests/support/slot_call.h"

namespace xtok::test {
namespace {

void* const kNull = nullptr;

enum class Shape {
    BoolNone,
    IntNone,
    PtrNone,
    BoolP,
    IntP,
    BoolPP,
    VoidPP,
    BoolPI,
    BoolPIP,
    BoolPPI,
    IntIP
};

// Calls `slot` with null pointers and zero numbers.
int64_t callWithNothing(void* p, int slot, Shape shape) {
    switch (shape) {
        case Shape::BoolNone:
            return callSlot<bool>(p, slot);
        case Shape::IntNone:
            return callSlot<int32_t>(p, slot);
        case Shape::PtrNone:
            return reinterpret_cast<intptr_t>(callSlot<void*>(p, slot));
        case Shape::BoolP:
            return callSlot<bool>(p, slot, kNull);
        case Shape::IntP:
            return callSlot<int32_t>(p, slot, kNull);
        case Shape::BoolPP:
            return callSlot<bool>(p, slot, kNull, kNull);
        case Shape::VoidPP:
            callSlot<void>(p, slot, kNull, kNull);
            return 0;
        case Shape::BoolPI:
            return callSlot<bool>(p, slot, kNull, int32_t{0});
        case Shape::BoolPIP:
            return callSlot<bool>(p, slot, kNull, int32_t{0}, kNull);
        case Shape::BoolPPI:
            return callSlot<bool>(p, slot, kNull, kNull, int32_t{0});
        case Shape::IntIP:
            return callSlot<int32_t>(p, slot, int32_t{0}, kNull);
    }
    return -1;
}

struct Default {
    int slot;
    Shape shape;
    int64_t result;
    int32_t code;  // 1 and "" when the slot must not touch the error record
    const char* text;
};

const char* const kEvents = "protocol does not support event channel";

const Default kDefaults[] = {{8, Shape::BoolNone, 1, 1, ""},
                             {9, Shape::BoolNone, 1, 1, ""},
                             {13, Shape::BoolPP, 0, -1, "Optimized writing not supported"},
                             {14, Shape::IntP, 0, 1, ""},
                             {15, Shape::IntP, 0, 1, ""},
                             {16, Shape::BoolPP, 0, 1, ""},
                             {17, Shape::BoolPIP, 0, 1, ""},
                             {26, Shape::PtrNone, 0, 1, ""},
                             {27, Shape::BoolNone, 0, 1, ""},
                             {31, Shape::IntIP, 0, 1, ""},
                             {34, Shape::IntNone, 0, 1, ""},
                             {35, Shape::IntNone, 0, 1, ""},
                             {36, Shape::IntNone, 0, 1, ""},
                             {37, Shape::IntNone, 0, 1, ""},
                             {39, Shape::BoolP, 0, 1, ""},
                             {40, Shape::BoolPPI, 0, 1, ""},
                             {41, Shape::IntNone, 0, 1, ""},
                             {42, Shape::IntNone, 0xFFFFFF, 1, ""},
                             {45, Shape::IntNone, 0, 1, ""},
                             {46, Shape::IntNone, 0, 1, ""},
                             {47, Shape::IntNone, 0, 1, ""},
                             {48, Shape::IntNone, 0, 1, ""},
                             {49, Shape::IntNone, 0, 1, ""},
                             {50, Shape::IntNone, 0, 1, ""},
                             {51, Shape::BoolPP, 0, -1, "read object not supported"},
                             {52, Shape::BoolPP, 0, -1, "write object not supported"},
                             {53, Shape::IntNone, 0, 1, ""},
                             {54, Shape::BoolPI, 0, 1, ""},
                             {55, Shape::IntNone, 0, 1, ""},
                             {56, Shape::BoolPP, 0, -1, kEvents},
                             {57, Shape::BoolPP, 0, -1, kEvents},
                             {58, Shape::VoidPP, 0, 1, ""},
                             {59, Shape::BoolPP, 0, -1, kEvents},
                             {60, Shape::BoolPP, 0, -1, kEvents},
                             {61, Shape::IntNone, 0, 1, ""},
                             {62, Shape::VoidPP, 0, 1, ""},
                             {63, Shape::BoolPP, 0, -1, "protocol does not support alarms"},
                             {64, Shape::VoidPP, 0, 1, ""},
                             {65, Shape::IntNone, 0, 1, ""},
                             {66, Shape::IntNone, 0, 1, ""},
                             {67, Shape::BoolPP, 0, -1, "protocol does not support trends"},
                             {68, Shape::VoidPP, 0, 1, ""},
                             {69, Shape::IntNone, 0, 1, ""},
                             {70, Shape::IntNone, 0, 1, ""}};

TEST(ProtocolDefaults, EachSlotAnswersAndRecordsAsDocumented) {
    for (const Default& d : kDefaults) {
        MemoryProtocol protocol;
        void* p = static_cast<IProtocol7*>(&protocol);
        EXPECT_EQ(callWithNothing(p, d.slot, d.shape), d.result) << "slot " << d.slot;
        EXPECT_EQ(callSlot<int32_t>(p, 20), d.code) << "slot " << d.slot;
        EXPECT_STREQ(callSlot<const char*>(p, 21), d.text) << "slot " << d.slot;
    }
}

TEST(ProtocolDefaults, UriFieldListIsEmpty) {
    MemoryProtocol protocol;
    protocol.namedFields = false;
    void* p = static_cast<IProtocol7*>(&protocol);
    const char* const* names = callSlot<const char* const*>(p, 83);
    ASSERT_NE(names, nullptr);
    EXPECT_EQ(names[0], nullptr);
    EXPECT_EQ(callSlot<int32_t>(p, 74), 0);
    EXPECT_EQ(callSlot<const char*>(p, 75, int32_t{0}), nullptr);
    EXPECT_EQ(callSlot<int32_t>(p, 76, "area"), -1);
}

// A protocol with a fixture: `p` is what a runtime holds.
class Protocol : public ::testing::Test {
protected:
    ITag* create(const char* uri) { return callSlot<ITag*>(p, 5, uri); }
    int32_t code() { return callSlot<int32_t>(p, 20); }
    std::string text() { return callSlot<const char*>(p, 21); }

    MemoryProtocol protocol;
    void* p = static_cast<IProtocol7*>(&protocol);
};

TEST_F(Protocol, ErrorRecordStartsAtOneAndSurvivesSuccess) {
    EXPECT_EQ(code(), 1);
    EXPECT_EQ(text(), "");
    callSlot<bool>(p, 52, kNull, kNull);
    int32_t value = 0;
    ASSERT_TRUE(callSlot<bool>(p, 10, create("bytes?0?int"), static_cast<void*>(&value)));
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(text(), "write object not supported");
}

TEST_F(Protocol, AnswersEveryInterfaceNameWithItself) {
    for (const char* name : {"ProtocolBase", "IProtocol7", "IProtocol6", "IProtocol5", "IProtocol4",
                             "IProtocol3", "IProtocol2", "IProtocol"}) {
        EXPECT_EQ(callSlot<void*>(p, 1, name), p) << name;
    }
    for (const char* name : {"iprotocol", "IProtocol8", "IProtocol7 ", "", "MemoryProtocol"}) {
        EXPECT_EQ(callSlot<void*>(p, 1, name), nullptr) << name;
    }
    EXPECT_EQ(callSlot<void*>(p, 1, static_cast<const char*>(nullptr)), nullptr);
}

TEST_F(Protocol, InstanceNameFallsBackToTheProtocolName) {
    EXPECT_STREQ(callSlot<const char*>(p, 28), "MEM");
    callSlot<void>(p, 29, "panel1");
    EXPECT_STREQ(callSlot<const char*>(p, 28), "panel1");
    callSlot<void>(p, 29, "");
    EXPECT_STREQ(callSlot<const char*>(p, 28), "MEM");
    EXPECT_STREQ(callSlot<const char*>(p, 19, int32_t{5}, int32_t{6}), "MEM");
}

TEST(ProtocolDestroy, RunsTheMostDerivedDestructorAndFreesOnlyWithBitZero) {
    int destroyed = 0;
    auto* owned = new MemoryProtocol;
    owned->destroyed = &destroyed;
    owned->CreateTag("bytes?0?byte");  // tags go with the protocol
    void* p = static_cast<IProtocol7*>(owned);
    EXPECT_EQ(callSlot<void*>(p, 0, 1u), p);
    EXPECT_EQ(destroyed, 1);

    alignas(MemoryProtocol) unsigned char storage[sizeof(MemoryProtocol)];
    auto* placed = new (storage) MemoryProtocol;
    placed->destroyed = &destroyed;
    void* q = static_cast<IProtocol7*>(placed);
    EXPECT_EQ(callSlot<void*>(q, 0, 0u), q);  // destructor only: storage is ours
    EXPECT_EQ(destroyed, 2);
}

TEST_F(Protocol, CreateTagKeepsGoodTagsAndExplainsBadOnes) {
    ITag* tag = create("bytes?1?byte");
    ASSERT_NE(tag, nullptr);
    EXPECT_EQ(protocol.Tags().size(), 1u);

    struct Bad {
        const char* uri;
        const char* text;
    };
    for (const Bad& bad :
         {Bad{"bytes?1", "Tag URI error: bytes?1 - 3 fields needed"},
          Bad{"bytes?0?nope", "Tag URI error: bytes?0?nope - nope: data type unknown"},
          Bad{"", "Tag URI error:  - 3 fields needed"}}) {
        EXPECT_EQ(create(bad.uri), nullptr);
        EXPECT_EQ(code(), -1);
        EXPECT_EQ(text(), bad.text);
    }
    protocol.failAllocation = true;
    EXPECT_EQ(create("bytes?1?byte"), nullptr);
    EXPECT_EQ(code(), 0);
    EXPECT_EQ(text(), "Can't allocate Tag");
    EXPECT_EQ(protocol.Tags().size(), 1u);

    callSlot<void>(p, 6, tag);
    EXPECT_TRUE(protocol.Tags().empty());
    callSlot<void>(p, 6, kNull);
}

TEST_F(Protocol, ReadTagConvertsOrKeepsTheReadError) {
    const uint8_t raw[] = {0x78, 0x56, 0x34, 0x12};
    std::memcpy(protocol.memory + 4, raw, 4);
    int32_t value = 0;
    EXPECT_TRUE(callSlot<bool>(p, 10, create("bytes?4?int"), static_cast<void*>(&value)));
    EXPECT_EQ(value, 0x12345678);
    EXPECT_TRUE(callSlot<bool>(p, 10, create("bytes?4?int(swap4)"), static_cast<void*>(&value)));
    EXPECT_EQ(value, 0x78563412);

    EXPECT_FALSE(callSlot<bool>(p, 10, create("bytes?4?short(swap4)"), static_cast<void*>(&value)));
    EXPECT_EQ(code(), -9);
    EXPECT_EQ(text(), "read conversion error");

    protocol.failRawReads = true;
    EXPECT_FALSE(callSlot<bool>(p, 10, create("bytes?4?int"), static_cast<void*>(&value)));
    EXPECT_EQ(code(), -1);
    EXPECT_EQ(text(), "raw read failed");
}

TEST_F(Protocol, BitTagsReadAndWriteOnlyTheirBits) {
    protocol.memory[32 + 1] = 0x20;  // bits?13
    protocol.memory[48 + 5] = 0xDF;  // words?2.13: every bit but 5
    uint8_t bit = 9;
    EXPECT_TRUE(callSlot<bool>(p, 10, create("bits?13?boolean"), static_cast<void*>(&bit)));
    EXPECT_EQ(bit, 1);
    EXPECT_TRUE(callSlot<bool>(p, 10, create("words?2.13?boolean"), static_cast<void*>(&bit)));
    EXPECT_EQ(bit, 0);

    const uint8_t eight[] = {1, 0, 1, 1, 0, 0, 0, 1};
    ASSERT_TRUE(protocol.WriteTag(create("bits?4?boolean-8"), eight));
    EXPECT_EQ(protocol.memory[32], 0xD0);  // bits 4-7 from the first four values
    EXPECT_EQ(protocol.memory[33], 0x28);  // bits 0-3 from the last four, bit 5 kept
    uint8_t back[8] = {};
    EXPECT_TRUE(callSlot<bool>(p, 10, create("bits?4?boolean-8"), static_cast<void*>(back)));
    EXPECT_EQ(0, std::memcmp(back, eight, 8));
}

TEST_F(Protocol, ArrayItemsAreCheckedThenReadOrRewritten) {
    ITag* array = create("bytes?0?short-4");
    ITag* scalar = create("bytes?0?short");
    int16_t item = 0;
    struct Refusal {
        ITag* tag;
        int32_t index;
        const char* text;
    };
    for (const Refusal& r :
         {Refusal{scalar, 0, "accessing an array item where the tag is not array"},
          Refusal{array, 4, "accessing array item out of range"},
          Refusal{array, -1, "accessing array item out of range"}}) {
        EXPECT_FALSE(callSlot<bool>(p, 78, r.tag, r.index, static_cast<void*>(&item)));
        EXPECT_EQ(code(), -1);
        EXPECT_EQ(text(), r.text);
        EXPECT_FALSE(callSlot<bool>(p, 79, r.tag, r.index, static_cast<const void*>(&item)));
    }
    protocol.memory[4] = 0x34;
    protocol.memory[5] = 0x12;
    EXPECT_TRUE(callSlot<bool>(p, 78, array, int32_t{2}, static_cast<void*>(&item)));
    EXPECT_EQ(item, 0x1234);

    protocol.memory[6] = 0xEE;
    item = 0x0102;
    EXPECT_TRUE(callSlot<bool>(p, 79, array, int32_t{3}, static_cast<const void*>(&item)));
    EXPECT_EQ(protocol.memory[6], 0x02);
    EXPECT_EQ(protocol.memory[7], 0x01);
    EXPECT_EQ(protocol.memory[4], 0x34);
}

TEST_F(Protocol, StampedReadsStampAfterSuccessOnly) {
    ITag* tag = create("bytes?0?int");
    int32_t value = 0;
    int64_t stamp = -5;
    int64_t before = NowStamp();
    EXPECT_TRUE(callSlot<bool>(p, 71, tag, static_cast<void*>(&value), &stamp));
    EXPECT_GE(stamp, before);
    EXPECT_LE(stamp, NowStamp());
    stamp = -5;
    EXPECT_TRUE(callSlot<bool>(p, 72, tag, static_cast<void*>(&value), int32_t{4}, &stamp));
    EXPECT_GE(stamp, before);

    protocol.failRawReads = true;
    stamp = -5;
    EXPECT_FALSE(callSlot<bool>(p, 71, tag, static_cast<void*>(&value), &stamp));
    EXPECT_FALSE(callSlot<bool>(p, 72, tag, static_cast<void*>(&value), int32_t{4}, &stamp));
    EXPECT_FALSE(callSlot<bool>(p, 80, tag, static_cast<void*>(&value), int32_t{32}, &stamp));
    EXPECT_EQ(stamp, -5);
}

// Block reads as a protocol that supports them would answer.
class BlockProtocol : public MemoryProtocol {
public:
    int32_t GetMaxTagsPerBlock(ITag*) override { return 3; }
    int32_t GetMaxBytesPerBlock(ITag*) override { return 8; }
    bool CanJoinBlock(ITag*, ITag*) override { return true; }
    bool ReadBlockRaw(ITag*, int32_t, void*) override { return true; }
};

TEST(ProtocolBlocks, MultipleReadsRespectTagAndByteLimits) {
    BlockProtocol protocol;
    void* p = static_cast<IProtocol7*>(&protocol);
    ITag* shorts[] = {protocol.CreateTag("bytes?0?short"), protocol.CreateTag("bytes?2?short"),
                      protocol.CreateTag("bytes?4?short")};
    ITag* wide = protocol.CreateTag("bytes?8?int64");
    EXPECT_TRUE(callSlot<bool>(p, 32, shorts, int32_t{2}, shorts[0]));   // 2 + 2 + 2 bytes
    EXPECT_FALSE(callSlot<bool>(p, 32, shorts, int32_t{3}, shorts[0]));  // 3 tags: not below 3
    EXPECT_FALSE(callSlot<bool>(p, 32, shorts, int32_t{1}, wide));       // 2 + 8 bytes

    int32_t status[3] = {};
    int64_t stamps[3] = {};
    uint8_t buffer[8];
    EXPECT_TRUE(
        callSlot<bool>(p, 73, shorts[0], int32_t{3}, static_cast<void*>(buffer), status, stamps));
    EXPECT_EQ(status[2], 1);
    EXPECT_GT(stamps[0], 0);
    EXPECT_EQ(stamps[2], stamps[0]);

    MemoryProtocol plain;  // the defaults: never in blocks
    EXPECT_FALSE(
        callSlot<bool>(static_cast<IProtocol7*>(&plain), 32, shorts, int32_t{1}, shorts[0]));
    EXPECT_FALSE(callSlot<bool>(static_cast<IProtocol7*>(&plain), 33, shorts[0], int32_t{1},
                                static_cast<void*>(buffer), status));
}

TEST_F(Protocol, OrdersAndJoinsTagsByAddress) {
    ITag* first = create("bytes?0?short");
    ITag* second = create("bytes?2?short");
    EXPECT_TRUE(callSlot<bool>(p, 43, first, second));
    EXPECT_FALSE(callSlot<bool>(p, 43, second, first));
    EXPECT_TRUE(callSlot<bool>(p, 44, second, first));  // first ends where second starts
    EXPECT_FALSE(callSlot<bool>(p, 44, first, second));
    EXPECT_TRUE(callSlot<bool>(p, 44, create("bits?3?boolean"), create("bits?0?boolean-3")));
    EXPECT_FALSE(callSlot<bool>(p, 44, create("bits?4?boolean"), create("bits?0?boolean-3")));
}

TEST_F(Protocol, UriFieldsByNameAndFromTheTagsAddress) {
    EXPECT_EQ(callSlot<int32_t>(p, 74), 3);
    EXPECT_EQ(callSlot<const char*>(p, 75, int32_t{-1}), nullptr);
    EXPECT_EQ(callSlot<const char*>(p, 75, int32_t{3}), nullptr);
    EXPECT_STREQ(callSlot<const char*>(p, 75, int32_t{1}), "address");
    EXPECT_EQ(callSlot<int32_t>(p, 76, "datatype"), 2);
    EXPECT_EQ(callSlot<int32_t>(p, 76, "Area"), -1);

    ITag* tag = create("bytes?1?byte-10");
    struct Field {
        int32_t index;
        const char* text;  // null: no such field
        int32_t length;
    };
    for (const Field& f : {Field{0, "bytes?1?byte-10", 5}, Field{2, "byte-10", 7},
                           Field{3, nullptr, -7}, Field{-1, nullptr, -7}}) {
        int32_t length = -7;
        EXPECT_STREQ(callSlot<const char*>(p, 77, tag, f.index, &length), f.text) << f.index;
        EXPECT_EQ(length, f.length) << f.index;
    }
    EXPECT_EQ(callSlot<const char*>(p, 77, kNull, int32_t{0}, kNull), nullptr);
}

}  // namespace
}  // namespace xtok::test
