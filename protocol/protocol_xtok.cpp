#include "protocol/protocol_xtok.h"

#include <climits>
#include <cstring>
#include <new>

#include "module/description_block.h"
#include "module/service_table.h"
#include "protocol/host_lock.h"
#include "protocol/token_model.h"
#include "protocol/xtok_tag.h"

namespace xtok {

Protocol_XTOK::Protocol_XTOK()
    : task_(services().multiTask, *this), port_(services().serialFactory) {
    models_.push_back(buildTokenModel());
    frame_.reserve(1024);
    if (IMultiTask2* tasks = services().multiTask) {
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
    const int32_t gap = gap_.load();
    const int32_t readTimeout = gap > 0 ? gap : 500;
    task_.Retire(readTimeout < INT32_MAX - 10000 ? readTimeout + 10000 : INT32_MAX);
    if (IMultiTask2* tasks = services().multiTask) {
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
    const XtokCommonParams& common = config_.GetCommon();
    portName_ = common.port;
    baud_ = common.baudrate;
    bits_ = common.bits;
    stop_ = common.stopbits;
    int32_t code = 0;
    if (!parityFromName(common.parity, code)) {
        SetLastError(-1, "Parser: parameter 'parity' has invalid value");
        return false;
    }
    parity_ = code;
    if (!modeFromName(common.mode, code)) {
        SetLastError(-1, "Parser: parameter 'mode' has invalid value");
        return false;
    }
    mode_ = code;
    return true;
}

LineSettings Protocol_XTOK::lineSettings() const {
    return LineSettings{baud_, parity_, bits_, stop_, mode_};
}

bool Protocol_XTOK::openPort() {
    return port_.Open(portName_, lineSettings());
}

void Protocol_XTOK::loadRetainedSettings() {
    settings_.setSection(GetInstanceName());
    const XtokCommonParams& common = config_.GetCommon();
    auto retainInt = [this](const char* key, std::atomic<int32_t>& value, int32_t def) {
        int32_t out = def;
        settings_.getInt(key, -1, def, out);
        value = out;
    };
    auto retainText = [this](const char* key, SharedText& value, const std::string& def) {
        std::string out;
        settings_.getText(key, -1, def, out);
        value.set(out);
    };
    retainInt("baud", baud_, baud_);
    retainInt("parity", parity_, parity_);
    retainInt("bits", bits_, bits_);
    retainInt("stop", stop_, stop_);
    retainInt("mode", mode_, mode_);
    retainText("rx_prefix", rxPrefix_, common.rx_prefix);
    retainText("rx_suffix", rxSuffix_, common.rx_suffix);
    retainText("tx_prefix", txPrefix_, common.tx_prefix);
    retainText("tx_suffix", txSuffix_, common.tx_suffix);
    retainInt("gap", gap_, common.gap);
    bool hex = common.hex_tokens;
    settings_.getBool("hex_tokens", -1, common.hex_tokens, hex);
    hexTokens_ = hex;
    retainInt("token_queue_size", tokenQueueSize_, common.token_queue_size);
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
    bool ended = task_.StopTask(1000);
    if (connected_) {
        if (ended) {
            port_.Close();
            connected_ = false;
        } else {
            // The task still runs: let it see the port go between two bytes.
            connected_ = false;
            HostLock lock(portLock_);
            port_.Close();
        }
    }
    started_ = false;
    return true;
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
