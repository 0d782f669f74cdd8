#include "tests/framework/memory_protocol.h"

#include <cstdlib>
#include <cstring>
#include <new>
#include <string>
#include <vector>

#include "params/text.h"

namespace xtok::test {
namespace {

const int32_t kAreaBase[] = {0, 32, 48};

MemoryType area(const char* name, int32_t naturalType, bool readOnly) {
    MemoryType type;
    type.name = name;
    type.naturalType = naturalType;
    type.icomMask = 0x7FFFFFF;  // every data type
    type.readOnly = readOnly;
    return type;
}

}  // namespace

ITag* MemoryTag::Clone() {
    return new (std::nothrow) MemoryTag(*this);
}

MemoryProtocol::MemoryProtocol() {
    model_.name = "1";
    model_.memoryTypes = {area("bytes", kByte, false), area("bits", kBoolean, false),
                          area("words", kUnsignedShort, true)};
}

MemoryProtocol::~MemoryProtocol() {
    if (destroyed) {
        ++*destroyed;
    }
}

ITag* MemoryProtocol::NewTag(const char* uri) {
    MemoryTag* tag = failAllocation ? nullptr : new (std::nothrow) MemoryTag;
    if (tag) {
        tag->valid = Parse(uri, *tag);
    }
    return AdoptNewTag(tag);
}

bool MemoryProtocol::Parse(const char* uri, MemoryTag& tag) {
    tag.uri = uri;
    std::vector<std::string> fields;
    splitTrimmed(uri, '?', fields);
    if (fields.size() != 3) {
        tag.SetError("3 fields needed");
        return false;
    }
    for (std::size_t i = 0; i < model_.memoryTypes.size(); ++i) {
        if (model_.memoryTypes[i].name == fields[0]) {
            tag.memoryType = &model_.memoryTypes[i];
            tag.base = kAreaBase[i];
        }
    }
    if (!tag.memoryType) {
        tag.SetError("no such area");
        return false;
    }
    char* rest = nullptr;
    tag.address = static_cast<int32_t>(std::strtol(fields[1].c_str(), &rest, 10));
    if (*rest == '.') {
        tag.index = static_cast<int32_t>(std::strtol(rest + 1, nullptr, 10));
    }
    if (!ParseDataType(fields[2], tag.dataType)) {
        tag.SetError(fields[2] + ": data type unknown");
        return false;
    }
    return true;
}

uint8_t* MemoryProtocol::Locate(ITag* tag, int32_t size) {
    auto* memoryTag = static_cast<MemoryTag*>(tag);
    int32_t at = memoryTag->base + tag->GetByteAddress();
    if (failRawReads || at < 0 || size < 0 || at + size > static_cast<int32_t>(sizeof memory)) {
        SetLastError(-1, "raw read failed");
        return nullptr;
    }
    return memory + at;
}

bool MemoryProtocol::ReadTagRaw(ITag* tag, void* buffer, int32_t size) {
    uint8_t* bytes = Locate(tag, size);
    if (bytes) {
        std::memcpy(buffer, bytes, size);
    }
    return bytes != nullptr;
}

bool MemoryProtocol::WriteTag(ITag* tag, const void* value) {
    uint8_t* bytes = Locate(tag, tag->GetRawSize());
    if (bytes && !tag->Convert(value, bytes, 1)) {
        SetLastError(-1, "write conversion error");
        return false;
    }
    return bytes != nullptr;
}

int32_t MemoryProtocol::GetTagProperty(ITag* tag) {
    return static_cast<TagBase*>(tag)->node;
}

const char* const* MemoryProtocol::GetUriFieldNames() {
    static const char* const kNames[] = {"area", "address", "datatype", nullptr};
    return namedFields ? kNames : ProtocolBase::GetUriFieldNames();
}

}  // namespace xtok::test
