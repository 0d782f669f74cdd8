// Where a tag's datum lies, and the tag's own slots by number.
#include <gtest/gtest.h>

#include <string>

#include "tests/framework/memory_protocol.h"
#include "tests/support/slot_call.h"

namespace xtok::test {
namespace {

struct Placement {
    const char* uri;
    int32_t byteAddress;
    int32_t bitOffset;
    int32_t rawSize;
};

// "bytes" has byte units, "words" 16-bit units, "bits" is a bit memory.
const Placement kPlacements[] = {
    {"words?2.13?boolean", 5, 5, 1},  // bit 13 of a word memory at word 2
    {"bits?13?boolean", 1, 5, 1},
    {"bits?4?boolean-8", 0, 4, 2},  // eight bits from bit 4 span
                                    // two bytes
    {"bits?0?boolean-8", 0, 0, 1},
    {"bits?7?boolean-2", 0, 7, 2},
    {"words?1?short-2", 2, 0, 4},
    {"bytes?0.3?short-4", 6, 3, 8},  // array index times element size
    {"words?3.1?int", 10, 1, 4},
    {"bits?2?byte", 2, 2, 1},
};

TEST(TagPlacement, ByteAddressBitOffsetAndRawSize) {
    MemoryProtocol protocol;
    for (const Placement& p : kPlacements) {
        ITag* tag = protocol.CreateTag(p.uri);
        ASSERT_NE(tag, nullptr) << p.uri;
        EXPECT_EQ(callSlot<int32_t>(tag, 2), p.byteAddress) << p.uri;
        EXPECT_EQ(callSlot<int32_t>(tag, 3), p.bitOffset) << p.uri;
        EXPECT_EQ(callSlot<int32_t>(tag, 8), p.rawSize) << p.uri;
    }
}

TEST(TagSlots, AnswerFromTheirFieldsAndMemoryType) {
    MemoryProtocol protocol;
    ITag* tag = protocol.CreateTag("words?0?short-4(swap2)");
    EXPECT_STREQ(callSlot<const char*>(tag, 4), "words?0?short-4(swap2)");
    EXPECT_EQ(callSlot<int32_t>(tag, 5), 15);
    EXPECT_EQ(callSlot<int32_t>(tag, 6), 8);
    EXPECT_EQ(callSlot<int32_t>(tag, 7), 3);
    EXPECT_TRUE(callSlot<bool>(tag, 10));  // "words" is read-only
    EXPECT_FALSE(callSlot<bool>(tag, 11));
    EXPECT_FALSE(callSlot<bool>(protocol.CreateTag("bytes?0?byte"), 10));

    const uint8_t raw[8] = {1, 2, 3, 4, 5, 6, 7, 8};
    uint8_t value[8] = {};
    EXPECT_TRUE(callSlot<bool>(tag, 9, static_cast<const void*>(raw), static_cast<void*>(value),
                               int32_t{0}));
    EXPECT_EQ(value[0], 2);
    EXPECT_EQ(value[7], 7);
    EXPECT_TRUE(callSlot<bool>(tag, 13, value, "swap2", int32_t{1}));
    EXPECT_EQ(value[0], 1);
    EXPECT_FALSE(callSlot<bool>(tag, 13, value, "swap16", int32_t{1}));
}

TEST(TagSlots, CloneIsIndependentAndBothDestroyEntriesFree) {
    MemoryProtocol protocol;
    auto* tag = static_cast<MemoryTag*>(protocol.CreateTag("bits?9?boolean"));
    auto* copy = static_cast<MemoryTag*>(callSlot<ITag*>(tag, 1));
    ASSERT_NE(copy, nullptr);
    EXPECT_EQ(copy->base, 32);  // the derived part came along
    tag->uri = "changed";
    EXPECT_STREQ(copy->GetUri(), "bits?9?boolean");
    EXPECT_EQ(callSlot<void*>(copy, 14, 1u), static_cast<void*>(copy));
    ITag* other = tag->Clone();
    EXPECT_EQ(callSlot<void*>(other, 0, 1u), static_cast<void*>(other));
}

}  // namespace
}  // namespace xtok::test
