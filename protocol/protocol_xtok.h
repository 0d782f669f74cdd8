// The token protocol: drives one serial port and exchanges free-form byte
// strings ("tokens") with the device on it, through tags on its memory types.
#pragma once

#include <atomic>
#include <cstdint>
#include <string>
#include <vector>

#include "framework/memory_type.h"
#include "framework/protocol_base.h"
#include "protocol/receive_task.h"
#include "protocol/retained_store.h"
#include "protocol/serial_port.h"
#include "protocol/spin_lock.h"
#include "protocol/staged_store.h"
#include "protocol/token_queue.h"
#include "protocol/xtok_config.h"

namespace xtok {

class XtokTag;

/// Threads: Configure, Start, Stop and destruction come from the runtime's
/// management thread; tag reads, writes and console commands from any
/// runtime thread; receiveToken from the receive task. queueLock guards the
/// queue and SP_Done, portLock each byte read and every open or close while
/// the task runs; when both are held, queueLock is taken first. The flags,
/// numbers and framing texts shared without a host lock are atomics or
/// SharedText, so a change takes effect at the next byte or token.
class Protocol_XTOK final : public ProtocolBase {
public:
    Protocol_XTOK();
    ~Protocol_XTOK() override;

    void* GetInterface(const char* name) override;
    const char* GetClassName() override { return "Protocol_XTOK"; }
    int32_t GetImplementationVersion() override { return 100; }
    bool Configure(const char* text) override;
    bool CanJoinTags(ITag* first, ITag* second, int32_t flag) override;
    bool Start() override;
    bool Stop() override;
    bool WriteTag(ITag* tag, const void* value) override;
    bool ReadTagRaw(ITag* tag, void* buffer, int32_t size) override;
    const char* GetName() override { return "XTOK"; }
    int32_t GetVersion() override { return 106; }
    int32_t GetCode() override { return 471; }
    const char* GetDisplayName() override { return "Xtokline"; }
    const char* GetXmlDescription() override;
    bool DoCommand(const char* command, char* reply, int32_t size) override;
    int32_t QueryRecord(int32_t query, void* record) override;
    int32_t GetTagProperty(ITag* tag) override;
    int32_t GetConnectionKind() override { return 2; }
    bool GetSerialSettings(char* buffer, int32_t length) override;
    int32_t GetLineOption() override { return 0; }
    ITag* NewTag(const char* uri) override;
    int32_t GetMaxAccessTime(int32_t) override { return 0; }
    const char* const* GetUriFieldNames() override;

    /// One pass of the receive task: waits for and queues at most one token
    /// (several in prefix-only framing).
    void receiveToken();

    // Read by tag creation.
    XtokConfig& config() { return config_; }
    const std::vector<Model>& models() const { return models_; }

private:
    // Start.
    void loadRetainedSettings();
    LineSettings lineSettings() const;
    bool openPort();

    // Receiving.
    enum class ReadResult { Byte, Timeout, Disconnected };
    void pushToken(const char* bytes, std::size_t length);
    /// One byte into `byte`, with portLock_ held around the read the way
    /// `portLock` holds it (see receive_framing.cpp).
    template <class Lock>
    ReadResult readByteLocked(const Lock& portLock, uint8_t* byte, int32_t timeoutMs);

    // Reads and writes of the memory types.
    bool readMemoryType(XtokTag& tag, int32_t element, uint8_t* buffer);
    bool readSettingsType(XtokTag& tag, uint8_t* buffer);
    bool readTokenType(XtokTag& tag, uint8_t* buffer);
    /// A setting as the SP_ types see it: the staged value while SP_Done
    /// has not applied it, else the retained one, else `active`.
    int32_t settingInt(const char* key, int32_t active);
    bool settingBool(const char* key, bool active);
    std::string settingText(const char* key, const std::string& active);
    /// `available`: bytes of the value from `value` on.
    bool writeMemoryType(XtokTag& tag, int32_t element, const uint8_t* value, int32_t available);
    bool stageSetting(XtokTag& tag, const uint8_t* value, int32_t available);
    bool writeConnect(const uint8_t* value, int32_t available);
    bool transmit(const std::string& text);
    void applyStagedSettings();
    bool partialRead(XtokTag& tag, int32_t index, int32_t count, int32_t offset, int32_t rawSize,
                     int32_t elementSize, uint8_t* scratch);

    // Console.
    bool driverCommand(const std::vector<std::string>& words, const char* line, char* reply,
                       int32_t size, bool& handled);
    bool consoleConnect(const std::vector<std::string>& words, char* reply, int32_t size);
    bool consolePut(const char* line, char* reply, int32_t size);
    bool consoleSet(const std::string& cmd, const std::string& value, char* reply, int32_t size);

    ReceiveTask task_;
    std::atomic<bool> started_{false};  // read by the runtime's threads
    XtokConfig config_;
    std::vector<Model> models_;
    RetainedStore settings_;
    StagedStore stagedSettings_;
    TokenQueue tokens_;
    SharedText rxPrefix_, rxSuffix_, txPrefix_, txSuffix_;
    std::atomic<int32_t> gap_{0};
    std::atomic<bool> hexTokens_{false};
    std::atomic<int32_t> tokenQueueSize_{100};
    std::string frame_;  ///< the receive task's frame under collection, reused
    /// The receive task's framing bytes, converted from rxPrefix_ and
    /// rxSuffix_ again whenever those texts have changed (their versions).
    struct FramingBytes {
        std::string bytes;
        uint32_t version = ~uint32_t{0};
    } rxPrefixBytes_, rxSuffixBytes_;
    std::string portName_;
    std::atomic<int32_t> baud_{0}, bits_{0}, stop_{0}, parity_{0}, mode_{0};
    SerialPort port_;
    IMutex* queueLock_ = nullptr;
    IMutex* portLock_ = nullptr;
    std::atomic<bool> connected_{false};
};

}  // namespace xtok
