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

#include "xtokline/common.h"

namespace xtok {

/// A tag: one datum addressed by "node?memorytype?datatype". Created by the
/// protocol (CreateTag, NewTag, Clone); destroyed with slot 0 or 14, or
/// through the protocol's DeleteTag when CreateTag made it.
class ITag {
public:
    /// slot 0
    virtual void* XTOK_SLOT_CALL Destroy(unsigned flags) = 0;
    /// slot 1: an independent copy, owned by the caller.
    virtual ITag* XTOK_SLOT_CALL Clone() = 0;
    /// slot 2: byte offset of the datum within its memory type.
    virtual int32_t XTOK_SLOT_CALL GetByteAddress() = 0;
    /// slot 3: bit within the first byte for the bit types (0-7).
    virtual int32_t XTOK_SLOT_CALL GetBitOffset() = 0;
    /// slot 4: the address text, unchanged.
    virtual const char* XTOK_SLOT_CALL GetUri() = 0;
    /// slot 5: data type code (1 boolean ... 27 object).
    virtual int32_t XTOK_SLOT_CALL GetTypeCode() = 0;
    /// slot 6: size in bytes; in bits for codes 1 and 13.
    virtual int32_t XTOK_SLOT_CALL GetSize() = 0;
    /// slot 7: element code; non-zero exactly for arrays and strings.
    virtual int32_t XTOK_SLOT_CALL GetElementCode() = 0;
    /// slot 8: bytes the datum occupies on the device.
    virtual int32_t XTOK_SLOT_CALL GetRawSize() = 0;
    /// slot 9: same as slot 12.
    virtual bool XTOK_SLOT_CALL ConvertData(const void* source, void* target,
                                            int32_t direction) = 0;
    /// slot 10
    virtual bool XTOK_SLOT_CALL IsReadOnly() = 0;
    /// slot 11
    virtual bool XTOK_SLOT_CALL IsWriteOnly() = 0;
    /// slot 12: raw bytes <-> value with the tag's conversions; direction 0
    /// reads (device to runtime), non-zero writes.
    virtual bool XTOK_SLOT_CALL Convert(const void* source, void* target, int32_t direction) = 0;
    /// slot 13: one named conversion on GetSize() bytes in place.
    virtual bool XTOK_SLOT_CALL ApplyConversion(uint8_t* bytes, const char* name,
                                                int32_t direction) = 0;
    /// slot 14: same as slot 0.
    virtual void* XTOK_SLOT_CALL DeleteSelf(unsigned flags) = 0;
};

/// The protocol: IProtocol to IProtocol7 are prefixes of this one table of
/// 84 slots (each later interface only appends), so all of those names give
/// the same pointer. Slots 56-70 carry event channel, alarm and trend calls
/// that this family of protocols does not support; their arguments are
/// unused here. Slots without a note answer a constant and touch nothing.
///
/// Callers: M is the runtime's management thread (configure, start, stop,
/// tags made and deleted, the instance name); S is any of the runtime's
/// threads that read and write tags or type console lines, several at once.
/// The protocol's own receive task calls no slot. The runtime holds none of
/// the protocol's locks when it calls; the protocol's two locks are host
/// mutexes, queueLock (the token queue, the settings and the framing) and
/// portLock (each byte read, each open and close), taken in that order.
/// Buffers passed in belong to the caller and are used during the call only;
/// texts handed out belong to the protocol.
class IProtocol7 {
public:
    /// M, after Stop. Runs the destructor and frees the object when bit 0 of `flags` is set
    /// (DestroyProtocol passes 1); returns its address.
    virtual void* XTOK_SLOT_CALL Destroy(unsigned flags) = 0;  // 0
    /// any thread. The object itself for "Protocol_XTOK", "ProtocolBase" and "IProtocol" to
    /// "IProtocol7" (exact), else null.
    virtual void* XTOK_SLOT_CALL GetInterface(const char* name) = 0;  // 1
    /// any thread. Static text owned by the protocol.
    virtual const char* XTOK_SLOT_CALL GetClassName() = 0;          // 2
    virtual int32_t XTOK_SLOT_CALL GetImplementationVersion() = 0;  // 3
    /// M, before Start (again to reconfigure while stopped). `text` is read during the call only.
    /// False with the error record set (code -1).
    virtual bool XTOK_SLOT_CALL Configure(const char* text) = 0;  // 4
    /// M. A tag for the address, kept in the protocol's list and owned by it until DeleteTag or the
    /// protocol's destruction; null with the error record set.
    virtual ITag* XTOK_SLOT_CALL CreateTag(const char* uri) = 0;  // 5
    /// M. Removes the tag from the list and destroys it; a tag not in the list is destroyed too.
    virtual void XTOK_SLOT_CALL DeleteTag(ITag* tag) = 0;  // 6
    /// M (the runtime's block planning). Reads the two tags only.
    virtual bool XTOK_SLOT_CALL CanJoinTags(ITag* first, ITag* second, int32_t flag) = 0;  // 7
    /// M. Loads the retained settings (queueLock), opens the port when autoConnect is set, starts
    /// the receive task. True when already started.
    virtual bool XTOK_SLOT_CALL Start() = 0;  // 8
    /// M. Asks the receive task to end (up to 1000 ms), then closes the port under queueLock and
    /// portLock, so a late task's read ends first.
    virtual bool XTOK_SLOT_CALL Stop() = 0;  // 9
    /// S. Reads into `value`, the caller's buffer of the tag's GetSize() bytes, through ReadTagRaw
    /// and the tag's conversions. queueLock is held for each element read of a token or settings
    /// type.
    virtual bool XTOK_SLOT_CALL ReadTag(ITag* tag, void* value) = 0;  // 10
    /// S. Writes the caller's `value` (GetSize() bytes, read during the call only). queueLock is
    /// held for each element written; a transmit and a connect take portLock inside it.
    virtual bool XTOK_SLOT_CALL WriteTag(ITag* tag, const void* value) = 0;  // 11
    /// S. `size` raw bytes into the caller's `buffer`; the locks as for ReadTag.
    virtual bool XTOK_SLOT_CALL ReadTagRaw(ITag* tag, void* buffer, int32_t size) = 0;  // 12
    /// S. Same as WriteTag.
    virtual bool XTOK_SLOT_CALL WriteTagOptimized(ITag* tag, const void* value) = 0;  // 13
    virtual int32_t XTOK_SLOT_CALL GetMaxTagsPerBlock(ITag* tag) = 0;                 // 14
    virtual int32_t XTOK_SLOT_CALL GetMaxBytesPerBlock(ITag* tag) = 0;                // 15
    virtual bool XTOK_SLOT_CALL CanJoinBlock(ITag* first, ITag* tag) = 0;             // 16
    /// S. `count` tags from `first` into the caller's `buffer`.
    virtual bool XTOK_SLOT_CALL ReadBlockRaw(ITag* first, int32_t count, void* buffer) = 0;  // 17
    /// any thread. Static text.
    virtual const char* XTOK_SLOT_CALL GetName() = 0;  // 18
    /// any thread. Static text.
    virtual const char* XTOK_SLOT_CALL GetNameFor(int32_t a, int32_t b) = 0;  // 19
    /// any thread. The last error of this protocol (1 when none).
    virtual int32_t XTOK_SLOT_CALL GetLastErrorCode() = 0;  // 20
    /// any thread. Text owned by the protocol, valid until its next error.
    virtual const char* XTOK_SLOT_CALL GetLastErrorText() = 0;  // 21
    virtual int32_t XTOK_SLOT_CALL GetVersion() = 0;            // 22
    virtual int32_t XTOK_SLOT_CALL GetCode() = 0;               // 23
    virtual const char* XTOK_SLOT_CALL GetDisplayName() = 0;    // 24
    /// any thread. Copies at most `size` bytes of the information text into the caller's `buffer`
    /// (no terminator when cut); returns the bytes copied, 0 without a buffer.
    virtual int32_t XTOK_SLOT_CALL GetInfo(char* buffer, int32_t size) = 0;  // 25
    /// any thread. The compressed description: static bytes in the library.
    virtual const char* XTOK_SLOT_CALL GetXmlDescription() = 0;  // 26
    virtual bool XTOK_SLOT_CALL OmitsServiceInfo() = 0;          // 27
    /// any thread. Text owned by the protocol, valid until SetInstanceName.
    virtual const char* XTOK_SLOT_CALL GetInstanceName() = 0;  // 28
    /// M, before Start: the section of the retained settings. `name` is copied.
    virtual void XTOK_SLOT_CALL SetInstanceName(const char* name) = 0;  // 29
    /// S (a console). The line is read during the call; the reply is copied into the caller's
    /// `reply` of `size` bytes, cut without a terminator when it does not fit. The queue commands,
    /// put, connect and the setters take queueLock (connect portLock too).
    virtual bool XTOK_SLOT_CALL DoCommand(const char* command, char* reply,
                                          int32_t size) = 0;  // 30
    /// S. Reads and writes the caller's `record` (at least 132 bytes).
    virtual int32_t XTOK_SLOT_CALL QueryRecord(int32_t query, void* record) = 0;               // 31
    virtual bool XTOK_SLOT_CALL CanReadMultiple(ITag** tags, int32_t count, ITag* first) = 0;  // 32
    /// S. As ReadTag for `count` tags from `first`, one status per tag into the caller's `status`.
    virtual bool XTOK_SLOT_CALL ReadMultiple(ITag* first, int32_t count, void* buffer,
                                             int32_t* status) = 0;  // 33
    virtual int32_t XTOK_SLOT_CALL Reserved34() = 0;                // 34
    virtual int32_t XTOK_SLOT_CALL Reserved35() = 0;                // 35
    virtual int32_t XTOK_SLOT_CALL Reserved36() = 0;                // 36
    virtual int32_t XTOK_SLOT_CALL Reserved37() = 0;                // 37
    /// any thread. The tag's node number.
    virtual int32_t XTOK_SLOT_CALL GetTagProperty(ITag* tag) = 0;                          // 38
    virtual bool XTOK_SLOT_CALL HasOptimizedRead(ITag* tag) = 0;                           // 39
    virtual bool XTOK_SLOT_CALL ReadOptimized(ITag* tag, void* buffer, int32_t bits) = 0;  // 40
    virtual int32_t XTOK_SLOT_CALL Reserved41() = 0;                                       // 41
    virtual int32_t XTOK_SLOT_CALL GetMaxTagCount() = 0;                                   // 42
    virtual bool XTOK_SLOT_CALL TagLess(ITag* a, ITag* b) = 0;                             // 43
    virtual bool XTOK_SLOT_CALL TagFollows(ITag* a, ITag* b) = 0;                          // 44
    virtual int32_t XTOK_SLOT_CALL Reserved45() = 0;                                       // 45
    virtual int32_t XTOK_SLOT_CALL Reserved46() = 0;                                       // 46
    virtual int32_t XTOK_SLOT_CALL Reserved47() = 0;                                       // 47
    virtual int32_t XTOK_SLOT_CALL Reserved48() = 0;                                       // 48
    virtual int32_t XTOK_SLOT_CALL Reserved49() = 0;                                       // 49
    virtual int32_t XTOK_SLOT_CALL Reserved50() = 0;                                       // 50
    /// S. Same as ReadTag.
    virtual bool XTOK_SLOT_CALL ReadObject(ITag* tag, void* value) = 0;  // 51
    /// S. Same as WriteTag.
    virtual bool XTOK_SLOT_CALL WriteObject(ITag* tag, const void* value) = 0;  // 52
    virtual int32_t XTOK_SLOT_CALL GetConnectionKind() = 0;                     // 53
    /// any thread. "port,baud,parity,bits,stop,mode" copied into the caller's `buffer` of `length`
    /// bytes, cut without a terminator when it does not fit.
    virtual bool XTOK_SLOT_CALL GetSerialSettings(char* buffer, int32_t length) = 0;  // 54
    virtual int32_t XTOK_SLOT_CALL GetLineOption() = 0;                               // 55
    virtual bool XTOK_SLOT_CALL OpenEventChannel(void* a, void* b) = 0;               // 56
    virtual bool XTOK_SLOT_CALL CloseEventChannel(void* a, void* b) = 0;              // 57
    virtual void XTOK_SLOT_CALL NotifyEventChannel(void* a, void* b) = 0;             // 58
    virtual bool XTOK_SLOT_CALL ReadEventChannel(void* a, void* b) = 0;               // 59
    virtual bool XTOK_SLOT_CALL WriteEventChannel(void* a, void* b) = 0;              // 60
    virtual int32_t XTOK_SLOT_CALL Reserved61() = 0;                                  // 61
    virtual void XTOK_SLOT_CALL NotifyAlarms(void* a, void* b) = 0;                   // 62
    virtual bool XTOK_SLOT_CALL ReadAlarms(void* a, void* b) = 0;                     // 63
    virtual void XTOK_SLOT_CALL AcknowledgeAlarms(void* a, void* b) = 0;              // 64
    virtual int32_t XTOK_SLOT_CALL Reserved65() = 0;                                  // 65
    virtual int32_t XTOK_SLOT_CALL Reserved66() = 0;                                  // 66
    virtual bool XTOK_SLOT_CALL ReadTrends(void* a, void* b) = 0;                     // 67
    virtual void XTOK_SLOT_CALL NotifyTrends(void* a, void* b) = 0;                   // 68
    virtual int32_t XTOK_SLOT_CALL Reserved69() = 0;                                  // 69
    virtual int32_t XTOK_SLOT_CALL Reserved70() = 0;                                  // 70
    /// S. As ReadTag; `*stamp` is the time the read finished (ms since 1970, UTC).
    virtual bool XTOK_SLOT_CALL ReadTagStamped(ITag* tag, void* value, int64_t* stamp) = 0;  // 71
    /// S. As ReadTagRaw, stamped.
    virtual bool XTOK_SLOT_CALL ReadTagRawStamped(ITag* tag, void* buffer, int32_t size,
                                                  int64_t* stamp) = 0;  // 72
    /// S. As ReadMultiple, one stamp per tag into the caller's `stamps`.
    virtual bool XTOK_SLOT_CALL ReadMultipleStamped(ITag* first, int32_t count, void* buffer,
                                                    int32_t* status,
                                                    int64_t* stamps) = 0;  // 73
    virtual int32_t XTOK_SLOT_CALL GetUriFieldCount() = 0;                 // 74
    /// any thread. Static text, or null past the last field.
    virtual const char* XTOK_SLOT_CALL GetUriFieldName(int32_t index) = 0;  // 75
    virtual int32_t XTOK_SLOT_CALL GetUriFieldIndex(const char* name) = 0;  // 76
    /// any thread. A pointer into the tag's own address text and the field's length in `*length`;
    /// valid while the tag lives.
    virtual const char* XTOK_SLOT_CALL GetUriField(ITag* tag, int32_t index,
                                                   int32_t* length) = 0;  // 77
    /// S. One element of an array tag into the caller's `value` (the element's size); reads the
    /// whole array.
    virtual bool XTOK_SLOT_CALL ReadArrayItem(ITag* tag, int32_t index, void* value) = 0;  // 78
    /// S. One element from the caller's `value`; rewrites the whole array.
    virtual bool XTOK_SLOT_CALL WriteArrayItem(ITag* tag, int32_t index,
                                               const void* value) = 0;  // 79
    /// S. As ReadOptimized, stamped.
    virtual bool XTOK_SLOT_CALL ReadOptimizedStamped(ITag* tag, void* buffer, int32_t bits,
                                                     int64_t* stamp) = 0;  // 80
    /// M, through CreateTag. A new tag owned by the caller, or null.
    virtual ITag* XTOK_SLOT_CALL NewTag(const char* uri) = 0;            // 81
    virtual int32_t XTOK_SLOT_CALL GetMaxAccessTime(int32_t reset) = 0;  // 82
    /// any thread. A static null-terminated list.
    virtual const char* const* XTOK_SLOT_CALL GetUriFieldNames() = 0;  // 83
};

/// Number of slots in the protocol table.
constexpr int kProtocolSlotCount = 84;

}  // namespace xtok
