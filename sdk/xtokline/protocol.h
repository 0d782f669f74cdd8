// The protocol object and its tags, as a runtime sees them.
//
// Threads: Configure, CreateTag, DeleteTag, Start, Stop and Destroy come from
// the runtime's management thread; reads, writes and DoCommand from any of its
// threads, concurrently with the protocol's own receive task.
//
// Buffers: every (buffer, size) pair is the caller's; the protocol writes at
// most `size` bytes and does not terminate a reply that fills the buffer.
// A tag's value buffer is exactly the tag's GetSize() bytes (bits for the
// boolean types are one byte each in the value). Returned texts belong to the
// protocol and stay valid until its next call from any thread that changes
// them (the last error text: until the next failure).
//
// Failures: operations answer false/0/null and keep the reason in the last
// error (slots 20, 21).
#pragma once

#include <cstdint>

namespace xtok {

/// A tag: one datum addressed by "node?memorytype?datatype". Created by the
/// protocol (CreateTag, NewTag, Clone); destroyed with slot 0 or 14, or
/// through the protocol's DeleteTag when CreateTag made it.
class ITag {
public:
    /// slot 0
    virtual void* Destroy(unsigned flags) = 0;
    /// slot 1: an independent copy, owned by the caller.
    virtual ITag* Clone() = 0;
    /// slot 2: byte offset of the datum within its memory type.
    virtual int32_t GetByteAddress() = 0;
    /// slot 3: bit within the first byte for the bit types (0-7).
    virtual int32_t GetBitOffset() = 0;
    /// slot 4: the address text, unchanged.
    virtual const char* GetUri() = 0;
    /// slot 5: data type code (1 boolean ... 27 object).
    virtual int32_t GetTypeCode() = 0;
    /// slot 6: size in bytes; in bits for codes 1 and 13.
    virtual int32_t GetSize() = 0;
    /// slot 7: element code; non-zero exactly for arrays and strings.
    virtual int32_t GetElementCode() = 0;
    /// slot 8: bytes the datum occupies on the device.
    virtual int32_t GetRawSize() = 0;
    /// slot 9: same as slot 12.
    virtual bool ConvertData(const void* source, void* target, int32_t direction) = 0;
    /// slot 10
    virtual bool IsReadOnly() = 0;
    /// slot 11
    virtual bool IsWriteOnly() = 0;
    /// slot 12: raw bytes <-> value with the tag's conversions; direction 0
    /// reads (device to runtime), non-zero writes.
    virtual bool Convert(const void* source, void* target, int32_t direction) = 0;
    /// slot 13: one named conversion on GetSize() bytes in place.
    virtual bool ApplyConversion(uint8_t* bytes, const char* name, int32_t direction) = 0;
    /// slot 14: same as slot 0.
    virtual void* DeleteSelf(unsigned flags) = 0;
};

/// The protocol: IProtocol to IProtocol7 are prefixes of this one table of
/// 84 slots (each later interface only appends), so all of those names give
/// the same pointer. Slots 56-70 carry event channel, alarm and trend calls
/// that this family of protocols does not support; their arguments are
/// unused here.
class IProtocol7 {
public:
    virtual void* Destroy(unsigned flags) = 0;                                   // 0
    virtual void* GetInterface(const char* name) = 0;                            // 1
    virtual const char* GetClassName() = 0;                                      // 2
    virtual int32_t GetImplementationVersion() = 0;                              // 3
    virtual bool Configure(const char* text) = 0;                                // 4
    virtual ITag* CreateTag(const char* uri) = 0;                                // 5
    virtual void DeleteTag(ITag* tag) = 0;                                       // 6
    virtual bool CanJoinTags(ITag* first, ITag* second, int32_t flag) = 0;       // 7
    virtual bool Start() = 0;                                                    // 8
    virtual bool Stop() = 0;                                                     // 9
    virtual bool ReadTag(ITag* tag, void* value) = 0;                            // 10
    virtual bool WriteTag(ITag* tag, const void* value) = 0;                     // 11
    virtual bool ReadTagRaw(ITag* tag, void* buffer, int32_t size) = 0;          // 12
    virtual bool WriteTagOptimized(ITag* tag, const void* value) = 0;            // 13
    virtual int32_t GetMaxTagsPerBlock(ITag* tag) = 0;                           // 14
    virtual int32_t GetMaxBytesPerBlock(ITag* tag) = 0;                          // 15
    virtual bool CanJoinBlock(ITag* first, ITag* tag) = 0;                       // 16
    virtual bool ReadBlockRaw(ITag* first, int32_t count, void* buffer) = 0;     // 17
    virtual const char* GetName() = 0;                                           // 18
    virtual const char* GetNameFor(int32_t a, int32_t b) = 0;                    // 19
    virtual int32_t GetLastErrorCode() = 0;                                      // 20
    virtual const char* GetLastErrorText() = 0;                                  // 21
    virtual int32_t GetVersion() = 0;                                            // 22
    virtual int32_t GetCode() = 0;                                               // 23
    virtual const char* GetDisplayName() = 0;                                    // 24
    virtual int32_t GetInfo(char* buffer, int32_t size) = 0;                     // 25
    virtual const char* GetXmlDescription() = 0;                                 // 26
    virtual bool OmitsServiceInfo() = 0;                                         // 27
    virtual const char* GetInstanceName() = 0;                                   // 28
    virtual void SetInstanceName(const char* name) = 0;                          // 29
    virtual bool DoCommand(const char* command, char* reply, int32_t size) = 0;  // 30
    virtual int32_t QueryRecord(int32_t query, void* record) = 0;                // 31
    virtual bool CanReadMultiple(ITag** tags, int32_t count, ITag* first) = 0;   // 32
    virtual bool ReadMultiple(ITag* first, int32_t count, void* buffer,
                              int32_t* status) = 0;                           // 33
    virtual int32_t Reserved34() = 0;                                         // 34
    virtual int32_t Reserved35() = 0;                                         // 35
    virtual int32_t Reserved36() = 0;                                         // 36
    virtual int32_t Reserved37() = 0;                                         // 37
    virtual int32_t GetTagProperty(ITag* tag) = 0;                            // 38
    virtual bool HasOptimizedRead(ITag* tag) = 0;                             // 39
    virtual bool ReadOptimized(ITag* tag, void* buffer, int32_t bits) = 0;    // 40
    virtual int32_t Reserved41() = 0;                                         // 41
    virtual int32_t GetMaxTagCount() = 0;                                     // 42
    virtual bool TagLess(ITag* a, ITag* b) = 0;                               // 43
    virtual bool TagFollows(ITag* a, ITag* b) = 0;                            // 44
    virtual int32_t Reserved45() = 0;                                         // 45
    virtual int32_t Reserved46() = 0;                                         // 46
    virtual int32_t Reserved47() = 0;                                         // 47
    virtual int32_t Reserved48() = 0;                                         // 48
    virtual int32_t Reserved49() = 0;                                         // 49
    virtual int32_t Reserved50() = 0;                                         // 50
    virtual bool ReadObject(ITag* tag, void* value) = 0;                      // 51
    virtual bool WriteObject(ITag* tag, const void* value) = 0;               // 52
    virtual int32_t GetConnectionKind() = 0;                                  // 53
    virtual bool GetSerialSettings(char* buffer, int32_t length) = 0;         // 54
    virtual int32_t GetLineOption() = 0;                                      // 55
    virtual bool OpenEventChannel(void* a, void* b) = 0;                      // 56
    virtual bool CloseEventChannel(void* a, void* b) = 0;                     // 57
    virtual void NotifyEventChannel(void* a, void* b) = 0;                    // 58
    virtual bool ReadEventChannel(void* a, void* b) = 0;                      // 59
    virtual bool WriteEventChannel(void* a, void* b) = 0;                     // 60
    virtual int32_t Reserved61() = 0;                                         // 61
    virtual void NotifyAlarms(void* a, void* b) = 0;                          // 62
    virtual bool ReadAlarms(void* a, void* b) = 0;                            // 63
    virtual void AcknowledgeAlarms(void* a, void* b) = 0;                     // 64
    virtual int32_t Reserved65() = 0;                                         // 65
    virtual int32_t Reserved66() = 0;                                         // 66
    virtual bool ReadTrends(void* a, void* b) = 0;                            // 67
    virtual void NotifyTrends(void* a, void* b) = 0;                          // 68
    virtual int32_t Reserved69() = 0;                                         // 69
    virtual int32_t Reserved70() = 0;                                         // 70
    virtual bool ReadTagStamped(ITag* tag, void* value, int64_t* stamp) = 0;  // 71
    virtual bool ReadTagRawStamped(ITag* tag, void* buffer, int32_t size,
                                   int64_t* stamp) = 0;  // 72
    virtual bool ReadMultipleStamped(ITag* first, int32_t count, void* buffer, int32_t* status,
                                     int64_t* stamps) = 0;                           // 73
    virtual int32_t GetUriFieldCount() = 0;                                          // 74
    virtual const char* GetUriFieldName(int32_t index) = 0;                          // 75
    virtual int32_t GetUriFieldIndex(const char* name) = 0;                          // 76
    virtual const char* GetUriField(ITag* tag, int32_t index, int32_t* length) = 0;  // 77
    virtual bool ReadArrayItem(ITag* tag, int32_t index, void* value) = 0;           // 78
    virtual bool WriteArrayItem(ITag* tag, int32_t index, const void* value) = 0;    // 79
    virtual bool ReadOptimizedStamped(ITag* tag, void* buffer, int32_t bits,
                                      int64_t* stamp) = 0;  // 80
    virtual ITag* NewTag(const char* uri) = 0;              // 81
    virtual int32_t GetMaxAccessTime(int32_t reset) = 0;    // 82
    virtual const char* const* GetUriFieldNames() = 0;      // 83
};

/// Number of slots in the protocol table.
constexpr int kProtocolSlotCount = 84;

}  // namespace xtok
