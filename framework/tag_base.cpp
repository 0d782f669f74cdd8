#include "framework/tag_base.h"

#include <cstring>
#include <new>

#include "xtokline/common.h"

namespace xtok {
namespace {

bool isBitMemory(const MemoryType* memoryType) {
    return memoryType && IsBitType(memoryType->naturalType);
}

}  // namespace

void* TagBase::Destroy(unsigned flags) {
    return destroyObject(this, flags);
}

void* TagBase::DeleteSelf(unsigned flags) {
    return destroyObject(this, flags);
}

ITag* TagBase::Clone() {
    return new (std::nothrow) TagBase(*this);
}

int32_t TagBase::GetByteAddress() {
    if (IsBitType(dataType.code) && isBitMemory(memoryType)) {
        return address / 8;
    }
    int64_t unit = memoryType ? ElementSize(memoryType->naturalType) : 1;
    int64_t start = int64_t{address} * unit;
    if (IsBitType(dataType.code)) {
        return static_cast<int32_t>(start + index / 8);
    }
    int64_t element = ElementSize(EffectiveElementCode(dataType.code, dataType.elementCode));
    return static_cast<int32_t>(start + int64_t{index} * element);
}

int32_t TagBase::GetBitOffset() {
    // "& 7" rather than "% 8": a negative index must not give a negative bit.
    return (isBitMemory(memoryType) ? address : index) & 7;
}

int32_t TagBase::GetRawSize() {
    int32_t size = dataType.size > 0 ? dataType.size : 0;
    if (!IsBitType(dataType.code)) {
        return size;
    }
    int32_t offset = GetBitOffset();
    return (offset + size - 1) / 8 - offset / 8 + 1;
}

bool TagBase::ConvertData(const void* source, void* target, int32_t direction) {
    return Convert(source, target, direction);
}

const char* UriField(const char* uri, int32_t index, int32_t* length) {
    if (!uri || index < 0) {
        return nullptr;
    }
    const char* field = uri;
    for (int32_t i = 0; i < index; ++i) {
        field = std::strchr(field, '?');
        if (!field) {
            return nullptr;
        }
        ++field;
    }
    if (length) {
        *length = static_cast<int32_t>(std::strcspn(field, "?"));
    }
    return field;
}

int64_t StartBit(ITag& tag) {
    int64_t start = int64_t{8} * tag.GetByteAddress();
    return IsBitType(tag.GetTypeCode()) ? start + tag.GetBitOffset() : start;
}

int64_t EndBit(ITag& tag) {
    int64_t length = IsBitType(tag.GetTypeCode()) ? tag.GetSize() : int64_t{8} * tag.GetRawSize();
    return StartBit(tag) + length;
}

}  // namespace xtok
