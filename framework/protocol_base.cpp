#include "framework/protocol_base.h"

#include <algorithm>
#include <cstring>
#include <new>

#include "framework/clock.h"
#include "framework/data_types.h"
#include "framework/scratch_buffer.h"
#include "framework/tag_base.h"
#include "xtokline/common.h"

namespace xtok {
namespace {

// Most derived first; "IProtocol" to "IProtocol7" are prefixes of one table.
const char* const kInterfaceNames[] = {"ProtocolBase", "IProtocol7", "IProtocol6", "IProtocol5",
                                       "IProtocol4",   "IProtocol3", "IProtocol2", "IProtocol"};

int32_t elementSizeOf(ITag& tag) {
    return ElementSize(EffectiveElementCode(tag.GetTypeCode(), tag.GetElementCode()));
}

}  // namespace

ProtocolBase::~ProtocolBase() {
    DeleteAllTags();
}

void* ProtocolBase::Destroy(unsigned flags) {
    return destroyObject(this, flags);
}

void* ProtocolBase::GetInterface(const char* name) {
    if (!name) {
        return nullptr;
    }
    for (const char* known : kInterfaceNames) {
        if (std::strcmp(name, known) == 0) {
            return this;
        }
    }
    return nullptr;
}

// ---- tags

ITag* ProtocolBase::CreateTag(const char* uri) {
    ITag* tag = NewTag(uri ? uri : "");
    if (tag) {
        tags_.push_back(tag);
    }
    return tag;
}

void ProtocolBase::DeleteTag(ITag* tag) {
    auto found = std::find(tags_.begin(), tags_.end(), tag);
    if (found != tags_.end()) {
        tags_.erase(found);
    }
    if (tag) {
        tag->Destroy(1);
    }
}

void ProtocolBase::DeleteAllTags() {
    std::list<ITag*> doomed;
    doomed.swap(tags_);
    for (ITag* tag : doomed) {
        tag->Destroy(1);
    }
}

ITag* ProtocolBase::AdoptNewTag(TagBase* tag) {
    if (!tag) {
        SetLastError(0, "Can't allocate Tag");
        return nullptr;
    }
    if (!tag->valid) {
        SetLastError(-1, "Tag URI error: " + tag->uri + " - " + tag->errorText);
        tag->Destroy(1);
        return nullptr;
    }
    return tag;
}

bool ProtocolBase::TagLess(ITag* a, ITag* b) {
    return a && b && a->GetByteAddress() < b->GetByteAddress();
}

bool ProtocolBase::TagFollows(ITag* a, ITag* b) {
    return a && b && EndBit(*b) == StartBit(*a);
}

// ---- error record and names

void ProtocolBase::SetLastError(int32_t code, const std::string& text) {
    lastErrorCode_ = code;
    lastErrorText_ = text;
}

void ProtocolBase::SetLastErrorText(const std::string& text) {
    lastErrorText_ = text;
}

const char* ProtocolBase::GetNameFor(int32_t, int32_t) {
    return GetName();
}

const char* ProtocolBase::GetInstanceName() {
    return instanceName_.empty() ? GetName() : instanceName_.c_str();
}

void ProtocolBase::SetInstanceName(const char* name) {
    instanceName_ = name ? name : "";
}

// ---- reads

bool ProtocolBase::ReadTag(ITag* tag, void* value) {
    if (!tag) {
        return false;
    }
    const int32_t rawSize = std::max(tag->GetRawSize(), 0);
    ScratchBuffer<64> raw(rawSize);
    if (!raw.ok()) {
        SetLastError(-1, kNoMemoryText);
        return false;
    }
    bool read;
    if (HasOptimizedRead(tag)) {
        int32_t bits = IsBitType(tag->GetTypeCode()) ? tag->GetSize() : rawSize * 8;
        read = ReadOptimized(tag, raw.data(), bits);
    } else {
        read = ReadTagRaw(tag, raw.data(), rawSize);
    }
    if (!read) {
        return false;
    }
    if (!tag->Convert(raw.data(), value, 0)) {
        SetLastError(-9, "read conversion error");
        return false;
    }
    return true;
}

bool ProtocolBase::CanReadMultiple(ITag** tags, int32_t count, ITag* first) {
    if (!tags || count < 1 || !first || !CanJoinBlock(first, tags[0])) {
        return false;
    }
    if (count >= GetMaxTagsPerBlock(first)) {
        return false;
    }
    int64_t bytes = first->GetRawSize();
    for (int32_t i = 0; i < count; ++i) {
        if (!tags[i]) {
            return false;
        }
        bytes += tags[i]->GetRawSize();
    }
    return bytes <= GetMaxBytesPerBlock(first);
}

bool ProtocolBase::ReadMultiple(ITag* first, int32_t count, void* buffer, int32_t* status) {
    if (!ReadBlockRaw(first, count, buffer)) {
        return false;
    }
    for (int32_t i = 0; status && i < count; ++i) {
        status[i] = 1;
    }
    return true;
}

namespace {

// The stamp is taken once the access has finished, and only for a success.
bool stampAfter(bool read, int64_t* stamp) {
    if (read && stamp) {
        *stamp = NowStamp();
    }
    return read;
}

}  // namespace

bool ProtocolBase::ReadTagStamped(ITag* tag, void* value, int64_t* stamp) {
    return stampAfter(ReadTag(tag, value), stamp);
}

bool ProtocolBase::ReadTagRawStamped(ITag* tag, void* buffer, int32_t size, int64_t* stamp) {
    return stampAfter(ReadTagRaw(tag, buffer, size), stamp);
}

bool ProtocolBase::ReadMultipleStamped(ITag* first, int32_t count, void* buffer, int32_t* status,
                                       int64_t* stamps) {
    if (!ReadMultiple(first, count, buffer, status)) {
        return false;
    }
    const int64_t now = NowStamp();
    for (int32_t i = 0; stamps && i < count; ++i) {
        stamps[i] = now;
    }
    return true;
}

bool ProtocolBase::ReadOptimizedStamped(ITag* tag, void* buffer, int32_t bits, int64_t* stamp) {
    return stampAfter(ReadOptimized(tag, buffer, bits), stamp);
}

// ---- array items

bool ProtocolBase::CheckArrayItem(ITag* tag, int32_t index) {
    if (!tag || tag->GetElementCode() == 0) {
        SetLastError(-1, "accessing an array item where the tag is not array");
        return false;
    }
    if (index < 0 || index >= ElementCount(tag->GetElementCode(), tag->GetSize())) {
        SetLastError(-1, "accessing array item out of range");
        return false;
    }
    return true;
}

bool ProtocolBase::ReadWhole(ITag* tag, int32_t index, const void* value,
                             ScratchBuffer<256>& whole) {
    if (!CheckArrayItem(tag, index) || !value) {
        return false;
    }
    if (!whole.ok()) {
        SetLastError(-1, kNoMemoryText);
        return false;
    }
    return ReadTag(tag, whole.data());
}

bool ProtocolBase::ReadArrayItem(ITag* tag, int32_t index, void* value) {
    ScratchBuffer<256> whole(tag ? tag->GetSize() : 0);
    if (!ReadWhole(tag, index, value, whole)) {
        return false;
    }
    const int32_t width = elementSizeOf(*tag);
    std::memcpy(value, whole.data() + int64_t{index} * width, width);
    return true;
}

// Writing one element rewrites the whole array on the device.
bool ProtocolBase::WriteArrayItem(ITag* tag, int32_t index, const void* value) {
    ScratchBuffer<256> whole(tag ? tag->GetSize() : 0);
    if (!ReadWhole(tag, index, value, whole)) {
        return false;
    }
    const int32_t width = elementSizeOf(*tag);
    std::memcpy(whole.data() + int64_t{index} * width, value, width);
    return WriteTag(tag, whole.data());
}

// ---- address fields

int32_t ProtocolBase::GetUriFieldCount() {
    const char* const* names = GetUriFieldNames();
    int32_t count = 0;
    while (names && names[count]) {
        ++count;
    }
    return count;
}

const char* ProtocolBase::GetUriFieldName(int32_t index) {
    return index >= 0 && index < GetUriFieldCount() ? GetUriFieldNames()[index] : nullptr;
}

int32_t ProtocolBase::GetUriFieldIndex(const char* name) {
    const int32_t count = GetUriFieldCount();
    for (int32_t i = 0; name && i < count; ++i) {
        if (std::strcmp(GetUriFieldNames()[i], name) == 0) {
            return i;
        }
    }
    return -1;
}

const char* ProtocolBase::GetUriField(ITag* tag, int32_t index, int32_t* length) {
    return tag ? UriField(tag->GetUri(), index, length) : nullptr;
}

const char* const* ProtocolBase::GetUriFieldNames() {
    static const char* const kNone[] = {nullptr};
    return kNone;
}

}  // namespace xtok
