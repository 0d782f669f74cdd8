// The base of every protocol class: the whole slot table with its defaults,
// the list of tags created through the protocol, the last error, the
// instance name and the framework console.
//
// A derived protocol supplies the slots left pure here: GetClassName,
// GetImplementationVersion, Configure, CanJoinTags, WriteTag, ReadTagRaw,
// GetName, GetVersion, GetCode, GetDisplayName, GetTagProperty, NewTag and
// GetMaxAccessTime. It never adds slots of its own.
#pragma once

#include <cstdint>
#include <list>
#include <string>

#include "framework/scratch_buffer.h"
#include "module/service_table.h"
#include "xtokline/protocol.h"

namespace xtok {

class TagBase;

class ProtocolBase : public IProtocol7 {
public:
    /// `services`: the host services a protocol was made with, listed by
    /// GetInfo; null for none.
    explicit ProtocolBase(const ServiceTable* services = nullptr) : services_(services) {}
    ProtocolBase(const ProtocolBase&) = delete;
    ProtocolBase& operator=(const ProtocolBase&) = delete;

    void* Destroy(unsigned flags) override;
    /// "ProtocolBase" and "IProtocol7" down to "IProtocol"; a derived class
    /// checks its own class name first and then calls this.
    void* GetInterface(const char* name) override;
    ITag* CreateTag(const char* uri) override;
    /// Destroys the tag even when it is not in the list.
    void DeleteTag(ITag* tag) override;
    bool Start() override { return true; }
    bool Stop() override { return true; }
    /// ReadTagRaw (or ReadOptimized), then the tag's conversion.
    bool ReadTag(ITag* tag, void* value) override;
    bool WriteTagOptimized(ITag* tag, const void* value) override;
    int32_t GetMaxTagsPerBlock(ITag* tag) override;
    int32_t GetMaxBytesPerBlock(ITag* tag) override;
    bool CanJoinBlock(ITag* first, ITag* tag) override;
    bool ReadBlockRaw(ITag* first, int32_t count, void* buffer) override;
    const char* GetNameFor(int32_t a, int32_t b) override;
    int32_t GetLastErrorCode() override { return lastErrorCode_; }
    const char* GetLastErrorText() override { return lastErrorText_.c_str(); }
    int32_t GetInfo(char* buffer, int32_t size) override;
    const char* GetXmlDescription() override;
    bool OmitsServiceInfo() override;
    const char* GetInstanceName() override;
    void SetInstanceName(const char* name) override;
    bool DoCommand(const char* command, char* reply, int32_t size) override;
    int32_t QueryRecord(int32_t query, void* record) override;
    bool CanReadMultiple(ITag** tags, int32_t count, ITag* first) override;
    bool ReadMultiple(ITag* first, int32_t count, void* buffer, int32_t* status) override;
    int32_t Reserved34() override;
    int32_t Reserved35() override;
    int32_t Reserved36() override;
    int32_t Reserved37() override;
    bool HasOptimizedRead(ITag* tag) override;
    bool ReadOptimized(ITag* tag, void* buffer, int32_t bits) override;
    int32_t Reserved41() override;
    int32_t GetMaxTagCount() override;
    bool TagLess(ITag* a, ITag* b) override;
    /// Whether b lies immediately before a.
    bool TagFollows(ITag* a, ITag* b) override;
    int32_t Reserved45() override;
    int32_t Reserved46() override;
    int32_t Reserved47() override;
    int32_t Reserved48() override;
    int32_t Reserved49() override;
    int32_t Reserved50() override;
    bool ReadObject(ITag* tag, void* value) override;
    bool WriteObject(ITag* tag, const void* value) override;
    int32_t GetConnectionKind() override;
    bool GetSerialSettings(char* buffer, int32_t length) override;
    int32_t GetLineOption() override;
    bool OpenEventChannel(void* a, void* b) override;
    bool CloseEventChannel(void* a, void* b) override;
    void NotifyEventChannel(void* a, void* b) override;
    bool ReadEventChannel(void* a, void* b) override;
    bool WriteEventChannel(void* a, void* b) override;
    int32_t Reserved61() override;
    void NotifyAlarms(void* a, void* b) override;
    bool ReadAlarms(void* a, void* b) override;
    void AcknowledgeAlarms(void* a, void* b) override;
    int32_t Reserved65() override;
    int32_t Reserved66() override;
    bool ReadTrends(void* a, void* b) override;
    void NotifyTrends(void* a, void* b) override;
    int32_t Reserved69() override;
    int32_t Reserved70() override;
    bool ReadTagStamped(ITag* tag, void* value, int64_t* stamp) override;
    bool ReadTagRawStamped(ITag* tag, void* buffer, int32_t size, int64_t* stamp) override;
    bool ReadMultipleStamped(ITag* first, int32_t count, void* buffer, int32_t* status,
                             int64_t* stamps) override;
    int32_t GetUriFieldCount() override;
    const char* GetUriFieldName(int32_t index) override;
    int32_t GetUriFieldIndex(const char* name) override;
    const char* GetUriField(ITag* tag, int32_t index, int32_t* length) override;
    bool ReadArrayItem(ITag* tag, int32_t index, void* value) override;
    bool WriteArrayItem(ITag* tag, int32_t index, const void* value) override;
    bool ReadOptimizedStamped(ITag* tag, void* buffer, int32_t bits, int64_t* stamp) override;
    /// An empty list.
    const char* const* GetUriFieldNames() override;

    /// After slot 83, so the contract's slot numbers stay as they are.
    /// Destroys every tag still in the list.
    virtual ~ProtocolBase();

    /// The error record: never cleared by a success.
    void SetLastError(int32_t code, const std::string& text);
    void SetLastErrorText(const std::string& text);

    /// Tags made by CreateTag and not deleted yet, oldest first.
    const std::list<ITag*>& Tags() const { return tags_; }

protected:
    /// The framework console behind DoCommand, for a derived console to fall
    /// through to: true when the first word is one of its commands (the reply
    /// is then written), false with `reply` untouched otherwise.
    bool FrameworkCommand(const char* command, char* reply, int32_t size);

    /// What NewTag returns for a tag it has just built: the tag when it is
    /// valid; otherwise null, with the reason in the error record ("Can't
    /// allocate Tag" for a null tag, "Tag URI error: <uri> - <tag's error>"
    /// for an invalid one, which is destroyed).
    ITag* AdoptNewTag(TagBase* tag);

    /// Destroys every tag in the list and empties it.
    void DeleteAllTags();

    /// Copies `text` as a reply: cut at `size` and then not terminated.
    static void CopyReply(const char* text, char* reply, int32_t size);

private:
    bool CheckArrayItem(ITag* tag, int32_t index);
    /// The whole array tag, through ReadTag, into a buffer sized for it, once
    /// `index` is an element of it and an element `value` is given.
    bool ReadWhole(ITag* tag, int32_t index, const void* value, ScratchBuffer<256>& whole);
    void ConsoleRead(const std::string& uri, char* reply, int32_t size);
    void ConsoleWrite(const std::string& uri, const std::string& hex, char* reply, int32_t size);

    const ServiceTable* services_;
    std::list<ITag*> tags_;
    int32_t lastErrorCode_ = 1;
    std::string lastErrorText_;
    std::string instanceName_;
};

}  // namespace xtok
