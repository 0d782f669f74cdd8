// The compiler's slot numbers of every contract interface against the
// numbers a foreign runtime calls. A wrong number here means a runtime calls
// the wrong function.
#include <gtest/gtest.h>

#include "framework/protocol_base.h"
#include "framework/tag_base.h"
#include "tests/support/slot_call.h"
#include "xtokline/plugin.h"

namespace xtok {
namespace {

using test::slotOf;

struct Slot {
    const char* name;
    int actual;
    int expected;
};

#define SLOT(Class, member, number)                         \
    Slot {                                                  \
#Class "::" #member, slotOf(&Class::member), number \
    }

void expectSlots(std::initializer_list<Slot> slots) {
    for (const Slot& slot : slots) {
        EXPECT_EQ(slot.actual, slot.expected) << slot.name;
    }
}

TEST(SlotNumbers, Protocol) {
    expectSlots({SLOT(IProtocol7, Destroy, 0),
                 SLOT(IProtocol7, GetInterface, 1),
                 SLOT(IProtocol7, GetClassName, 2),
                 SLOT(IProtocol7, GetImplementationVersion, 3),
                 SLOT(IProtocol7, Configure, 4),
                 SLOT(IProtocol7, CreateTag, 5),
                 SLOT(IProtocol7, DeleteTag, 6),
                 SLOT(IProtocol7, CanJoinTags, 7),
                 SLOT(IProtocol7, Start, 8),
                 SLOT(IProtocol7, Stop, 9),
                 SLOT(IProtocol7, ReadTag, 10),
                 SLOT(IProtocol7, WriteTag, 11),
                 SLOT(IProtocol7, ReadTagRaw, 12),
                 SLOT(IProtocol7, WriteTagOptimized, 13),
                 SLOT(IProtocol7, GetMaxTagsPerBlock, 14),
                 SLOT(IProtocol7, GetMaxBytesPerBlock, 15),
                 SLOT(IProtocol7, CanJoinBlock, 16),
                 SLOT(IProtocol7, ReadBlockRaw, 17),
                 SLOT(IProtocol7, GetName, 18),
                 SLOT(IProtocol7, GetNameFor, 19),
                 SLOT(IProtocol7, GetLastErrorCode, 20),
                 SLOT(IProtocol7, GetLastErrorText, 21),
                 SLOT(IProtocol7, GetVersion, 22),
                 SLOT(IProtocol7, GetCode, 23),
                 SLOT(IProtocol7, GetDisplayName, 24),
                 SLOT(IProtocol7, GetInfo, 25),
                 SLOT(IProtocol7, GetXmlDescription, 26),
                 SLOT(IProtocol7, OmitsServiceInfo, 27),
                 SLOT(IProtocol7, GetInstanceName, 28),
                 SLOT(IProtocol7, SetInstanceName, 29),
                 SLOT(IProtocol7, DoCommand, 30),
                 SLOT(IProtocol7, QueryRecord, 31),
                 SLOT(IProtocol7, CanReadMultiple, 32),
                 SLOT(IProtocol7, ReadMultiple, 33),
                 SLOT(IProtocol7, Reserved34, 34),
                 SLOT(IProtocol7, Reserved35, 35),
                 SLOT(IProtocol7, Reserved36, 36),
                 SLOT(IProtocol7, Reserved37, 37),
                 SLOT(IProtocol7, GetTagProperty, 38),
                 SLOT(IProtocol7, HasOptimizedRead, 39),
                 SLOT(IProtocol7, ReadOptimized, 40),
                 SLOT(IProtocol7, Reserved41, 41),
                 SLOT(IProtocol7, GetMaxTagCount, 42),
                 SLOT(IProtocol7, TagLess, 43),
                 SLOT(IProtocol7, TagFollows, 44),
                 SLOT(IProtocol7, Reserved45, 45),
                 SLOT(IProtocol7, Reserved46, 46),
                 SLOT(IProtocol7, Reserved47, 47),
                 SLOT(IProtocol7, Reserved48, 48),
                 SLOT(IProtocol7, Reserved49, 49),
                 SLOT(IProtocol7, Reserved50, 50),
                 SLOT(IProtocol7, ReadObject, 51),
                 SLOT(IProtocol7, WriteObject, 52),
                 SLOT(IProtocol7, GetConnectionKind, 53),
                 SLOT(IProtocol7, GetSerialSettings, 54),
                 SLOT(IProtocol7, GetLineOption, 55),
                 SLOT(IProtocol7, OpenEventChannel, 56),
                 SLOT(IProtocol7, CloseEventChannel, 57),
                 SLOT(IProtocol7, NotifyEventChannel, 58),
                 SLOT(IProtocol7, ReadEventChannel, 59),
                 SLOT(IProtocol7, WriteEventChannel, 60),
                 SLOT(IProtocol7, Reserved61, 61),
                 SLOT(IProtocol7, NotifyAlarms, 62),
                 SLOT(IProtocol7, ReadAlarms, 63),
                 SLOT(IProtocol7, AcknowledgeAlarms, 64),
                 SLOT(IProtocol7, Reserved65, 65),
                 SLOT(IProtocol7, Reserved66, 66),
                 SLOT(IProtocol7, ReadTrends, 67),
                 SLOT(IProtocol7, NotifyTrends, 68),
                 SLOT(IProtocol7, Reserved69, 69),
                 SLOT(IProtocol7, Reserved70, 70),
                 SLOT(IProtocol7, ReadTagStamped, 71),
                 SLOT(IProtocol7, ReadTagRawStamped, 72),
                 SLOT(IProtocol7, ReadMultipleStamped, 73),
                 SLOT(IProtocol7, GetUriFieldCount, 74),
                 SLOT(IProtocol7, GetUriFieldName, 75),
                 SLOT(IProtocol7, GetUriFieldIndex, 76),
                 SLOT(IProtocol7, GetUriField, 77),
                 SLOT(IProtocol7, ReadArrayItem, 78),
                 SLOT(IProtocol7, WriteArrayItem, 79),
                 SLOT(IProtocol7, ReadOptimizedStamped, 80),
                 SLOT(IProtocol7, NewTag, 81),
                 SLOT(IProtocol7, GetMaxAccessTime, 82),
                 SLOT(IProtocol7, GetUriFieldNames, 83)});
}

// The classes' own destructors come after the contract's slots.
TEST(SlotNumbers, BaseClassesKeepTheContractTable) {
    expectSlots({SLOT(ProtocolBase, Destroy, 0), SLOT(ProtocolBase, DoCommand, 30),
                 SLOT(ProtocolBase, ReadArrayItem, 78), SLOT(ProtocolBase, GetUriFieldNames, 83),
                 SLOT(TagBase, Destroy, 0), SLOT(TagBase, Convert, 12),
                 SLOT(TagBase, DeleteSelf, 14)});
}

TEST(SlotNumbers, Tag) {
    expectSlots({SLOT(ITag, Destroy, 0), SLOT(ITag, Clone, 1), SLOT(ITag, GetByteAddress, 2),
                 SLOT(ITag, GetBitOffset, 3), SLOT(ITag, GetUri, 4), SLOT(ITag, GetTypeCode, 5),
                 SLOT(ITag, GetSize, 6), SLOT(ITag, GetElementCode, 7), SLOT(ITag, GetRawSize, 8),
                 SLOT(ITag, ConvertData, 9), SLOT(ITag, IsReadOnly, 10),
                 SLOT(ITag, IsWriteOnly, 11), SLOT(ITag, Convert, 12),
                 SLOT(ITag, ApplyConversion, 13), SLOT(ITag, DeleteSelf, 14)});
}

TEST(SlotNumbers, PluginSide) {
    expectSlots({SLOT(IInterfaceFactory, GetInterface, 0), SLOT(IInterfaceFactory, Release, 1),
                 SLOT(IProtocolFactory, Destroy, 0), SLOT(IProtocolFactory, GetInterface, 1),
                 SLOT(IProtocolFactory, GetName, 2), SLOT(IProtocolFactory, GetVersion, 3),
                 SLOT(IProtocolFactory, CreateProtocol, 4),
                 SLOT(IProtocolFactory, DestroyProtocol, 5), SLOT(IProtModule, Destroy, 0),
                 SLOT(IProtModule, GetInterface, 1), SLOT(IProtModule, GetName, 2),
                 SLOT(IProtModule, GetVersion, 3), SLOT(IProtModule, Init, 4),
                 SLOT(IProtModule, Exit, 5), SLOT(IProtModule, GetErrorText, 6),
                 SLOT(IRunnable, Destroy, 0), SLOT(IRunnable, Run, 1)});
}

TEST(SlotNumbers, HostSide) {
    expectSlots({SLOT(IServiceProvider, GetService, 0),
                 SLOT(IServiceProvider, ReleaseService, 1),
                 SLOT(IHostService, Destroy, 0),
                 SLOT(IHostService, GetInterface, 1),
                 SLOT(IHostService, GetName, 2),
                 SLOT(IHostService, GetVersion, 3),
                 SLOT(IMultiTask2, Reserved4, 4),
                 SLOT(IMultiTask2, StopTask, 5),
                 SLOT(IMultiTask2, CreateMutex, 6),
                 SLOT(IMultiTask2, DestroyMutex, 7),
                 SLOT(IMultiTask2, Sleep, 8),
                 SLOT(IMultiTask2, Reserved9, 9),
                 SLOT(IMultiTask2, Reserved10, 10),
                 SLOT(IMultiTask2, Reserved11, 11),
                 SLOT(IMultiTask2, CreateTask, 12),
                 SLOT(ITask, Destroy, 0),
                 SLOT(ITask, Reserved1, 1),
                 SLOT(ITask, IsStopRequested, 2),
                 SLOT(ITask, Reserved3, 3),
                 SLOT(ITask, Start, 4),
                 SLOT(IMutex, Destroy, 0),
                 SLOT(IMutex, Lock, 1),
                 SLOT(IMutex, TryLock, 2),
                 SLOT(IMutex, Unlock, 3),
                 SLOT(ISerialFactory, Open, 4),
                 SLOT(ISerialFactory, Close, 5),
                 SLOT(ISerialPort, Destroy, 0),
                 SLOT(ISerialPort, Reserved1, 1),
                 SLOT(ISerialPort, Reserved2, 2),
                 SLOT(ISerialPort, Reserved3, 3),
                 SLOT(ISerialPort, Configure, 4),
                 SLOT(ISerialPort, Reserved5, 5),
                 SLOT(ISerialPort, ReadByte, 6),
                 SLOT(ISerialPort, Write, 7),
                 SLOT(IPermanentStorage, WriteText, 4),
                 SLOT(IPermanentStorage, WriteBool, 5),
                 SLOT(IPermanentStorage, WriteInt, 6),
                 SLOT(IPermanentStorage, ReadText, 7),
                 SLOT(IPermanentStorage, ReadBool, 8),
                 SLOT(IPermanentStorage, ReadInt, 9),
                 SLOT(IPermanentStorage, IsStored, 10),
                 SLOT(IPermanentStorage2, Reserved11, 11),
                 SLOT(IPermanentStorage2, Reserved12, 12),
                 SLOT(IPermanentStorage2, Reserved13, 13),
                 SLOT(IPermanentStorage2, ReadTextTo, 14)});
}

}  // namespace
}  // namespace xtok
