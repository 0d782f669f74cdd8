// A protocol over 64 bytes of memory, so that the framework's reads, writes,
// conversions and console run through real code. Addresses read
// "area?address[.index]?datatype" with the areas "bytes" (bytes 0-31),
// "bits" (a bit memory, bytes 32-47) and "words" (16-bit units, bytes 48-63,
// read-only).
#pragma once

#include <cstdint>

#include "framework/memory_type.h"
#include "framework/protocol_base.h"
#include "framework/tag_base.h"

namespace xtok::test {

class MemoryTag : public TagBase {
public:
    ITag* Clone() override;
    int32_t base = 0;  ///< where the tag's area starts in the memory
};

class MemoryProtocol : public ProtocolBase {
public:
    MemoryProtocol();
    ~MemoryProtocol() override;

    const char* GetClassName() override { return "MemoryProtocol"; }
    int32_t GetImplementationVersion() override { return 7; }
    bool Configure(const char*) override { return true; }
    bool CanJoinTags(ITag*, ITag*, int32_t) override { return false; }
    bool WriteTag(ITag* tag, const void* value) override;
    bool ReadTagRaw(ITag* tag, void* buffer, int32_t size) override;
    const char* GetName() override { return "MEM"; }
    int32_t GetVersion() override { return 3; }
    int32_t GetCode() override { return 42; }
    const char* GetDisplayName() override { return "Memory"; }
    int32_t GetTagProperty(ITag* tag) override;
    ITag* NewTag(const char* uri) override;
    int32_t GetMaxAccessTime(int32_t) override { return 12; }
    /// The three field names, or the base's empty list without namedFields.
    const char* const* GetUriFieldNames() override;

    uint8_t memory[64] = {};
    bool namedFields = true;
    bool failRawReads = false;    ///< raw reads fail with "raw read failed"
    bool failAllocation = false;  ///< NewTag behaves as if out of memory
    int* destroyed = nullptr;     ///< counts destructor runs when set

private:
    bool Parse(const char* uri, MemoryTag& tag);
    /// The tag's bytes in memory, or null (with the last error set).
    uint8_t* Locate(ITag* tag, int32_t size);

    Model model_;
};

}  // namespace xtok::test
