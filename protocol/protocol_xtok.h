// The token protocol: drives one serial port and exchanges free-form byte
// strings ("tokens") with the device on it, through tags on its memory types.
#pragma once

#include <array>
#include <atomic>
#include <cstdint>
#include <string>
#include <vector>

#include "framework/memory_type.h"
#include "framework/protocol_base.h"
#include "module/service_table.h"
#include "protocol/receive_task.h"
#include "protocol/retained_store.h"
#include "protocol/serial_port.h"
#include "protocol/settings.h"
#include "protocol/staged_store.h"
#include "protocol/token_queue.h"
#include "protocol/xtok_config.h"

namespace xtok {

class XtokTag;

/// Threads: Configure, Start, Stop and destruction come from the runtime's
/// management thread; tag reads, writes and console commands from any
/// runtime thread; receiveToken from the receive task. Two host mutexes:
/// queueLock guards the queue, the settings stores, the framing texts and
/// every use of the port but the byte reads; portLock guards each byte read
/// and every open and close. When both are held, queueLock is taken first.
/// Numbers and flags are single-word atomics, read without a lock.
class Protocol_XTOK final : public ProtocolBase {
public:
    explicit Protocol_XTOK(const ServiceTable& services);
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
    /// Opens or closes the port, taking portLock; the caller holds
    /// queueLock. False when an open failed.
    bool setConnected(bool on);

    // Receiving.
    enum class ReadResult { Byte, Timeout, Disconnected };
    void pushToken(const char* bytes, std::size_t length);
    ReadResult readByte(uint8_t* byte, int32_t timeoutMs);
    /// A byte within `timeoutMs`, read in bounded slices; Disconnected also
    /// when the task is asked to stop between two slices.
    ReadResult readWithin(uint8_t* byte, int32_t timeoutMs);
    /// A pass that reads only while connected; true when it read any byte.
    bool receiveFramed(const std::string& prefix, const std::string& suffix, int32_t timeout);

    // Settings, with queueLock held.
    StoredValue activeValue(SettingId id) const;
    void makeActive(SettingId id, const StoredValue& value);
    /// A setting as the SP_ types see it: the staged value while SP_Done
    /// has not applied it, else the retained one, else the active value of
    /// `fallback`.
    StoredValue settingValue(const Setting& setting, SettingId fallback);
    void applyStagedSettings();

    // Reads and writes of the memory types.
    bool readMemoryType(XtokTag& tag, int32_t element, uint8_t* buffer);
    bool readSettingsType(XtokTag& tag, uint8_t* buffer);
    bool readTokenType(XtokTag& tag, uint8_t* buffer);
    /// `available`: bytes of the value from `value` on.
    bool writeMemoryType(XtokTag& tag, int32_t element, const uint8_t* value, int32_t available);
    bool stageSetting(const Setting& setting, const uint8_t* value, int32_t available);
    bool writeConnect(const uint8_t* value, int32_t available);
    enum class Sent { Ok, NotHex, NotConnected };
    /// Frames and writes a token (hex text in hex mode); a failed write is
    /// not reported. The caller holds queueLock.
    Sent send(const std::string& text);
    bool transmit(const std::string& text);
    bool partialRead(XtokTag& tag, int32_t index, int32_t count, int32_t offset, int32_t rawSize,
                     int32_t elementSize, uint8_t* scratch);

    // Console.
    bool driverCommand(const std::vector<std::string>& words, const char* line, char* reply,
                       int32_t size, bool& handled);
    bool queueCommand(const std::vector<std::string>& words, char* reply, int32_t size,
                      bool& handled);
    bool consoleConnect(const std::vector<std::string>& words, char* reply, int32_t size);
    bool consolePut(const char* line, char* reply, int32_t size);
    bool consoleSet(const Setting& setting, const std::string& value, char* reply, int32_t size);

    const ServiceTable& services_;
    ReceiveTask task_;
    std::atomic<bool> started_{false};  // read by the runtime's threads
    XtokConfig config_;
    std::vector<Model> models_;
    RetainedStore settings_;
    StagedStore stagedSettings_;
    TokenQueue tokens_;
    /// Active values of the numbers, flags and codes, by setting.
    std::array<std::atomic<int32_t>, kSettingCount> active_{};
    /// Active values of the hex texts, by setting.
    std::array<std::string, kSettingCount> activeText_;
    std::string frame_;                ///< the receive task's frame under collection, reused
    std::string rxPrefix_, rxSuffix_;  ///< the receive task's framing bytes, reused
    std::string portName_;
    SerialPort port_;
    IMutex* queueLock_ = nullptr;
    IMutex* portLock_ = nullptr;
    std::atomic<bool> connected_{false};
    /// Port closes so far. A pass that began before a close ends at its next
    /// byte, even when the port has been opened again meanwhile: a frame
    /// never joins bytes from both sides of a disconnect.
    std::atomic<uint32_t> closes_{0};
    uint32_t passCloses_ = 0;  ///< closes_ when the receive task's pass began
};

}  // namespace xtok
