// The answers of the slots that a protocol may leave alone: most refuse as
// not supported, the others answer 0 or do nothing.
#include "framework/protocol_base.h"

namespace xtok {
namespace {

constexpr const char* kNoEventChannel = "protocol does not support event channel";

}  // namespace

bool ProtocolBase::WriteTagOptimized(ITag*, const void*) {
    SetLastError(-1, "Optimized writing not supported");
    return false;
}

bool ProtocolBase::ReadObject(ITag*, void*) {
    SetLastError(-1, "read object not supported");
    return false;
}

bool ProtocolBase::WriteObject(ITag*, const void*) {
    SetLastError(-1, "write object not supported");
    return false;
}

bool ProtocolBase::OpenEventChannel(void*, void*) {
    SetLastError(-1, kNoEventChannel);
    return false;
}

bool ProtocolBase::CloseEventChannel(void*, void*) {
    SetLastError(-1, kNoEventChannel);
    return false;
}

bool ProtocolBase::ReadEventChannel(void*, void*) {
    SetLastError(-1, kNoEventChannel);
    return false;
}

bool ProtocolBase::WriteEventChannel(void*, void*) {
    SetLastError(-1, kNoEventChannel);
    return false;
}

bool ProtocolBase::ReadAlarms(void*, void*) {
    SetLastError(-1, "protocol does not support alarms");
    return false;
}

bool ProtocolBase::ReadTrends(void*, void*) {
    SetLastError(-1, "protocol does not support trends");
    return false;
}

void ProtocolBase::NotifyEventChannel(void*, void*) {}
void ProtocolBase::NotifyAlarms(void*, void*) {}
void ProtocolBase::AcknowledgeAlarms(void*, void*) {}
void ProtocolBase::NotifyTrends(void*, void*) {}

// No block reads: the runtime then reads tag by tag.
int32_t ProtocolBase::GetMaxTagsPerBlock(ITag*) {
    return 0;
}
int32_t ProtocolBase::GetMaxBytesPerBlock(ITag*) {
    return 0;
}
bool ProtocolBase::CanJoinBlock(ITag*, ITag*) {
    return false;
}
bool ProtocolBase::ReadBlockRaw(ITag*, int32_t, void*) {
    return false;
}

bool ProtocolBase::HasOptimizedRead(ITag*) {
    return false;
}
bool ProtocolBase::ReadOptimized(ITag*, void*, int32_t) {
    return false;
}

int32_t ProtocolBase::GetMaxTagCount() {
    return 0xFFFFFF;
}

const char* ProtocolBase::GetXmlDescription() {
    return nullptr;
}
bool ProtocolBase::OmitsServiceInfo() {
    return false;
}
int32_t ProtocolBase::QueryRecord(int32_t, void*) {
    return 0;
}
int32_t ProtocolBase::GetConnectionKind() {
    return 0;
}
bool ProtocolBase::GetSerialSettings(char*, int32_t) {
    return false;
}
int32_t ProtocolBase::GetLineOption() {
    return 0;
}

// Reserved slots keep the later slots at their numbers.
int32_t ProtocolBase::Reserved34() {
    return 0;
}
int32_t ProtocolBase::Reserved35() {
    return 0;
}
int32_t ProtocolBase::Reserved36() {
    return 0;
}
int32_t ProtocolBase::Reserved37() {
    return 0;
}
int32_t ProtocolBase::Reserved41() {
    return 0;
}
int32_t ProtocolBase::Reserved45() {
    return 0;
}
int32_t ProtocolBase::Reserved46() {
    return 0;
}
int32_t ProtocolBase::Reserved47() {
    return 0;
}
int32_t ProtocolBase::Reserved48() {
    return 0;
}
int32_t ProtocolBase::Reserved49() {
    return 0;
}
int32_t ProtocolBase::Reserved50() {
    return 0;
}
int32_t ProtocolBase::Reserved61() {
    return 0;
}
int32_t ProtocolBase::Reserved65() {
    return 0;
}
int32_t ProtocolBase::Reserved66() {
    return 0;
}
int32_t ProtocolBase::Reserved69() {
    return 0;
}
int32_t ProtocolBase::Reserved70() {
    return 0;
}

}  // namespace xtok
