// The compiler's slot numbers of every contract interface against the numbers
// a foreign runtime calls. A wrong number means the runtime calls the wrong
// function; a slot appended to an interface moves whatever a class adds after it.
#include <gtest/gtest.h>

#include <typeinfo>

#include "framework/protocol_base.h"
#include "framework/tag_base.h"
#include "tests/support/slot_call.h"
#include "xtokline/plugin.h"

namespace xtok {
namespace {

using test::slotOf;

// A function declared after the interface's own lands in its first free slot.
template <class I>
struct Appended : I {
    virtual void appended() {}
};

// The members, in slot order from `first`, are the whole table of I.
template <class I, class... Members>
void expectTable(int first, Members... members) {
    int slot = first;
    for (int actual : {slotOf(members)...}) {
        EXPECT_EQ(actual, slot++) << typeid(I).name();
    }
    EXPECT_EQ(slotOf(&Appended<I>::appended), slot) << typeid(I).name() << " grew at the end";
}

// Members are written &C::Name, C standing for the interface.
#define EXPECT_TABLE(I, first, ...)         \
    [] {                                    \
        using C = I;                        \
        expectTable<C>(first, __VA_ARGS__); \
    }()

TEST(SlotNumbers, EveryInterfaceOfTheContract) {
    EXPECT_TABLE(
        IProtocol7, 0, &C::Destroy, &C::GetInterface, &C::GetClassName,
        &C::GetImplementationVersion, &C::Configure, &C::CreateTag, &C::DeleteTag, &C::CanJoinTags,
        &C::Start, &C::Stop, &C::ReadTag, &C::WriteTag, &C::ReadTagRaw, &C::WriteTagOptimized,
        &C::GetMaxTagsPerBlock, &C::GetMaxBytesPerBlock, &C::CanJoinBlock, &C::ReadBlockRaw,
        &C::GetName, &C::GetNameFor, &C::GetLastErrorCode, &C::GetLastErrorText, &C::GetVersion,
        &C::GetCode, &C::GetDisplayName, &C::GetInfo, &C::GetXmlDescription, &C::OmitsServiceInfo,
        &C::GetInstanceName, &C::SetInstanceName, &C::DoCommand, &C::QueryRecord,
        &C::CanReadMultiple, &C::ReadMultiple, &C::Reserved34, &C::Reserved35, &C::Reserved36,
        &C::Reserved37, &C::GetTagProperty, &C::HasOptimizedRead, &C::ReadOptimized, &C::Reserved41,
        &C::GetMaxTagCount, &C::TagLess, &C::TagFollows, &C::Reserved45, &C::Reserved46,
        &C::Reserved47, &C::Reserved48, &C::Reserved49, &C::Reserved50, &C::ReadObject,
        &C::WriteObject, &C::GetConnectionKind, &C::GetSerialSettings, &C::GetLineOption,
        &C::OpenEventChannel, &C::CloseEventChannel, &C::NotifyEventChannel, &C::ReadEventChannel,
        &C::WriteEventChannel, &C::Reserved61, &C::NotifyAlarms, &C::ReadAlarms,
        &C::AcknowledgeAlarms, &C::Reserved65, &C::Reserved66, &C::ReadTrends, &C::NotifyTrends,
        &C::Reserved69, &C::Reserved70, &C::ReadTagStamped, &C::ReadTagRawStamped,
        &C::ReadMultipleStamped, &C::GetUriFieldCount, &C::GetUriFieldName, &C::GetUriFieldIndex,
        &C::GetUriField, &C::ReadArrayItem, &C::WriteArrayItem, &C::ReadOptimizedStamped,
        &C::NewTag, &C::GetMaxAccessTime, &C::GetUriFieldNames);
    EXPECT_TABLE(ITag, 0, &C::Destroy, &C::Clone, &C::GetByteAddress, &C::GetBitOffset, &C::GetUri,
                 &C::GetTypeCode, &C::GetSize, &C::GetElementCode, &C::GetRawSize, &C::ConvertData,
                 &C::IsReadOnly, &C::IsWriteOnly, &C::Convert, &C::ApplyConversion, &C::DeleteSelf);
    // The classes the protocol and its tags derive from override in place:
    // another polymorphic base in front would renumber the contract's slots.
    EXPECT_EQ(slotOf(&ProtocolBase::DoCommand), 30);
    EXPECT_EQ(slotOf(&TagBase::DeleteSelf), 14);
    EXPECT_TABLE(IInterfaceFactory, 0, &C::GetInterface, &C::Release);
    EXPECT_TABLE(IProtocolFactory, 0, &C::Destroy, &C::GetInterface, &C::GetName, &C::GetVersion,
                 &C::CreateProtocol, &C::DestroyProtocol);
    EXPECT_TABLE(IProtModule, 0, &C::Destroy, &C::GetInterface, &C::GetName, &C::GetVersion,
                 &C::Init, &C::Exit, &C::GetErrorText);
    EXPECT_TABLE(IRunnable, 0, &C::Destroy, &C::Run);
    EXPECT_TABLE(IServiceProvider, 0, &C::GetService, &C::ReleaseService);
    EXPECT_TABLE(IHostService, 0, &C::Destroy, &C::GetInterface, &C::GetName, &C::GetVersion);
    EXPECT_TABLE(IMultiTask2, 4, &C::Reserved4, &C::StopTask, &C::CreateMutex, &C::DestroyMutex,
                 &C::Sleep, &C::Reserved9, &C::Reserved10, &C::Reserved11, &C::CreateTask);
    EXPECT_TABLE(ITask, 0, &C::Destroy, &C::Reserved1, &C::IsStopRequested, &C::Reserved3,
                 &C::Start);
    EXPECT_TABLE(IMutex, 0, &C::Destroy, &C::Lock, &C::TryLock, &C::Unlock);
    EXPECT_TABLE(ISerialFactory, 4, &C::Open, &C::Close);
    EXPECT_TABLE(ISerialPort, 0, &C::Destroy, &C::Reserved1, &C::Reserved2, &C::Reserved3,
                 &C::Configure, &C::Reserved5, &C::ReadByte, &C::Write);
    EXPECT_TABLE(IPermanentStorage, 4, &C::WriteText, &C::WriteBool, &C::WriteInt, &C::ReadText,
                 &C::ReadBool, &C::ReadInt, &C::IsStored);
    EXPECT_TABLE(IPermanentStorage2, 11, &C::Reserved11, &C::Reserved12, &C::Reserved13,
                 &C::ReadTextTo);
}

}  // namespace
}  // namespace xtok
