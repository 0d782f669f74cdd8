#include "protocol/protocol_xtok.h"

#include <climits>
#include <cstring>
#include <new>

#include "module/description_block.h"
#include "protocol/host_lock.h"
#include "protocol/token_model.h"
#include "protocol/xtok_tag.h"

namespace xtok {

Protocol_XTOK::Protocol_XTOK(const ServiceTable& services)
    : ProtocolBase(&services),
      services_(services),
      task_(services.multiTask, *this),
      port_(services.serialFactory) {
    models_.push_back(buildTokenModel());
    frame_.reserve(1024);
    if (IMultiTask2* tasks = services_.multiTask) {
        queueLock_ = tasks->CreateMutex(0);
        portLock_ = tasks->CreateMutex(0);
    }
}

Protocol_XTOK::~Protocol_XTOK() {
    // A runtime stops the protocol first; should it not have, or should the
    // host's stop have timed out, the task must not outlive the object it
    // reads. With the port given up, a pass ends within one read time-out.
    connected_ = false;
    if (task_.HasTask()) {
        task_.StopTask(1000);
    }
    // A pass ends within one slice of its read (500 ms) once the port is given up.
    task_.Retire(10500);
    if (IMultiTask2* tasks = services_.multiTask) {
        tasks->DestroyMutex(queueLock_);
        tasks->DestroyMutex(portLock_);
    }
    port_.Close();
}

void* Protocol_XTOK::GetInterface(const char* name) {
    if (name && std::strcmp(name, "Protocol_XTOK") == 0) {
        return this;
    }
    return ProtocolBase::GetInterface(name);
}

bool Protocol_XTOK::Configure(const char* text) {
    if (!config_.Parse(text ? text : "")) {
        SetLastError(-1, config_.GetLastError());
        return false;
    }
    XtokCommonParams& common = config_.GetCommon();
    portName_ = common.port;
    for (const Setting& setting : kSettings) {
        const SettingId id = setting.id;
        const bool decoded = setting.spelledAs == SpelledAs::ParityName
                                 ? parityFromName(common.text[id], common.number[id])
                             : setting.spelledAs == SpelledAs::ModeName
                                 ? modeFromName(common.text[id], common.number[id])
                                 : true;
        if (!decoded) {
            SetLastError(
                -1, std::string("Parser: parameter '") + setting.configKey + "' has invalid value");
            return false;
        }
        // Set at Start for all but the line settings, which a reported
        // settings text shows from now on.
        if (setting.activation == Activation::PortReconfigure) {
            active_[id] = common.number[id];
        }
    }
    return true;
}

LineSettings Protocol_XTOK::lineSettings() const {
    return LineSettings{active_[kBaud], active_[kParity], active_[kBits], active_[kStop],
                        active_[kMode]};
}

bool Protocol_XTOK::openPort() {
    return port_.Open(portName_, lineSettings());
}

// The configured value of each setting is the default of its retained one.
void Protocol_XTOK::loadRetainedSettings() {
    HostLock lock(queueLock_);
    settings_.attach(services_.permanentStorage, GetInstanceName());
    const XtokCommonParams& common = config_.GetCommon();
    for (const Setting& setting : kSettings) {
        const SettingId id = setting.id;
        if (setting.activation != Activation::PortReconfigure) {
            makeActive(id, setting.kind == SettingKind::Hex ? StoredValue(common.text[id])
                                                            : StoredValue(common.number[id]));
        }
        makeActive(id, settings_.get(setting.key, -1, activeValue(id)));
    }
}

bool Protocol_XTOK::Start() {
    if (started_) {
        return true;
    }
    loadRetainedSettings();
    if (config_.GetCommon().autoConnect) {
        // The receive task is not running yet, so no lock is needed.
        if (!openPort()) {
            SetLastError(-1, "Can't open serial port");
            return false;
        }
        connected_ = true;
    }
    task_.StartTask(3, 0);
    started_ = true;
    return true;
}

bool Protocol_XTOK::Stop() {
    if (!started_) {
        return true;
    }
    // Should the task not end in time, the close still waits for its read.
    task_.StopTask(1000);
    HostLock lock(queueLock_);
    setConnected(false);
    started_ = false;
    return true;
}

bool Protocol_XTOK::setConnected(bool on) {
    if (!on) {
        // Cleared before waiting for portLock: the receive task ends its
        // pass at the next byte instead of reading on.
        if (connected_.exchange(false)) {
            closes_.fetch_add(1, std::memory_order_relaxed);
            HostLock port(portLock_);
            port_.Close();
        }
        return true;
    }
    HostLock port(portLock_);
    if (!connected_) {
        connected_ = openPort();
    }
    return connected_;
}

const char* Protocol_XTOK::GetXmlDescription() {
    return descriptionSizeLine();
}

int32_t Protocol_XTOK::QueryRecord(int32_t query, void* record) {
    auto* bytes = static_cast<uint8_t*>(record);
    if (!bytes) {
        return 0;
    }
    if (query == 0) {
        int32_t kind = 0;
        std::memcpy(&kind, bytes, sizeof kind);
        int32_t answer = kind == 3 ? 1 : 0;
        std::memcpy(bytes + 4, &answer, sizeof answer);
        return 1;
    }
    if (query == 3) {
        return bytes[128];
    }
    return 0;
}

int32_t Protocol_XTOK::GetTagProperty(ITag* tag) {
    return tag ? static_cast<XtokTag*>(tag)->node : 0;
}

bool Protocol_XTOK::GetSerialSettings(char* buffer, int32_t length) {
    if (!buffer) {
        return false;
    }
    CopyReply(settingsText(portName_, lineSettings()).c_str(), buffer, length);
    return true;
}

ITag* Protocol_XTOK::NewTag(const char* uri) {
    try {
        return AdoptNewTag(new XtokTag(*this, uri ? uri : ""));
    } catch (const std::bad_alloc&) {
        // Nothing may throw into the runtime.
        return AdoptNewTag(nullptr);
    }
}

const char* const* Protocol_XTOK::GetUriFieldNames() {
    static const char* const names[] = {"node", "memorytype", "datatype", nullptr};
    return names;
}

bool Protocol_XTOK::CanJoinTags(ITag* first, ITag* second, int32_t flag) {
    if (flag != 0 || !first || !second) {
        return false;
    }
    auto& a = *static_cast<XtokTag*>(first);
    auto& b = *static_cast<XtokTag*>(second);
    if (a.node != b.node || a.memoryType != b.memoryType || !a.memoryType) {
        return false;
    }
    if (a.start() > b.start()) {
        return false;
    }
    const MemoryType& type = *a.memoryType;
    int64_t end;
    if (IsBitType(type.naturalType)) {
        end = int64_t{b.start()} + b.ElementCount();
    } else {
        int64_t unit = ElementSize(type.naturalType);
        int64_t count = b.ElementCount();
        if (b.GetTypeCode() == kBooleanArray) {
            count /= 8;
        }
        int64_t elementSize =
            ElementSize(EffectiveElementCode(b.dataType.code, b.dataType.elementCode));
        end = b.start() + (count * elementSize + unit - 1) / unit;
    }
    return end - a.start() <= type.blockReadCount;
}

}  // namespace xtok
