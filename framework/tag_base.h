// The framework's tag: one datum of a protocol, addressed by a text such as
// "node?memorytype?datatype". A protocol derives its own tag class from it,
// fills the fields while parsing the address and sets `valid`.
#pragma once

#include <cstdint>
#include <string>

#include "framework/data_types.h"
#include "framework/memory_type.h"
#include "xtokline/protocol.h"

namespace xtok {

class TagBase : public ITag {
public:
    TagBase() = default;
    TagBase(const TagBase&) = default;
    TagBase& operator=(const TagBase&) = delete;

    void* Destroy(unsigned flags) override;
    /// A copy as a TagBase: a derived class with fields of its own overrides it.
    ITag* Clone() override;
    int32_t GetByteAddress() override;
    int32_t GetBitOffset() override;
    const char* GetUri() override { return uri.c_str(); }
    int32_t GetTypeCode() override { return dataType.code; }
    int32_t GetSize() override { return dataType.size; }
    int32_t GetElementCode() override { return dataType.elementCode; }
    int32_t GetRawSize() override;
    bool ConvertData(const void* source, void* target, int32_t direction) override;
    bool IsReadOnly() override { return memoryType && memoryType->readOnly; }
    bool IsWriteOnly() override { return memoryType && memoryType->writeOnly; }
    /// Sets the error text to "Conversion error at: <name>" when one fails.
    bool Convert(const void* source, void* target, int32_t direction) override;
    bool ApplyConversion(uint8_t* bytes, const char* name, int32_t direction) override;
    void* DeleteSelf(unsigned flags) override;

    /// After slot 14, so the contract's slot numbers stay as they are.
    virtual ~TagBase() = default;

    bool IsArray() const { return dataType.elementCode != 0; }
    int32_t ElementCount() const { return xtok::ElementCount(dataType.elementCode, dataType.size); }
    void SetError(const std::string& text) { errorText = text; }

    DataType dataType;      ///< code, element code, size and conversion names
    std::string errorText;  ///< empty while the tag is good
    bool valid = false;     ///< set by the protocol's builder
    std::string uri;        ///< the address text, unchanged
    int32_t node = 0;
    int32_t address = 0;  ///< element index of the datum within its memory type
    int32_t index = 0;    ///< bit or array index
    const MemoryType* memoryType = nullptr;
    const void* nodeParams = nullptr;  ///< the protocol's own node record
};

/// Field `index` (from 0) of a "?"-separated address text, with its length
/// in `length` (when given); null when the text has fewer fields.
const char* UriField(const char* uri, int32_t index, int32_t* length);

/// Bit positions of a tag within its memory type's area: a tag b lies
/// immediately before a tag a when EndBit(b) == StartBit(a).
int64_t StartBit(ITag& tag);
int64_t EndBit(ITag& tag);

}  // namespace xtok
