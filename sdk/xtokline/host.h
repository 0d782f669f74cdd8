// Host side of the contract: the service provider handed to IProtModule::Init
// and the services the plug-in obtains from it by name.
//
// Threads: GetService/ReleaseService are called from the runtime's management
// thread inside Init/Exit. The services themselves are called from any thread
// of the runtime and from the plug-in's own tasks; every host service must be
// safe to call concurrently.
//
// Ownership: a service returned by GetService belongs to the host; the plug-in
// gives it back with ReleaseService exactly once and never calls its Destroy.
#pragma once

#include <cstdint>

#include "xtokline/common.h"

namespace xtok {

/// Handed to IProtModule::Init. Not destroyed across the contract.
class IServiceProvider {
public:
    /// slot 0: the service with this exact name, or null when the host has none.
    virtual void* XTOK_SLOT_CALL GetService(const char* name) = 0;
    /// slot 1: gives back a service obtained by GetService.
    virtual void XTOK_SLOT_CALL ReleaseService(void* service) = 0;
};

/// The four slots every host service begins with.
class IHostService {
public:
    /// slot 0: owned by the host; the plug-in never calls it.
    virtual void* XTOK_SLOT_CALL Destroy(unsigned flags) = 0;
    /// slot 1: another interface of the same service by exact name, or null.
    virtual void* XTOK_SLOT_CALL GetInterface(const char* name) = 0;
    /// slot 2: the service's own name; static text owned by the host.
    virtual const char* XTOK_SLOT_CALL GetName() = 0;
    /// slot 3
    virtual int32_t XTOK_SLOT_CALL GetVersion() = 0;
};

/// The body of a task: an object of the plug-in's, handed to
/// IMultiTask2::CreateTask. The plug-in owns it and keeps it alive until the
/// task has ended; the host never destroys it.
class IRunnable {
public:
    /// slot 0
    virtual void* XTOK_SLOT_CALL Destroy(unsigned flags) = 0;
    /// slot 1: called once, on the task's own thread, after ITask::Start.
    /// Returns when the task is asked to stop (it polls ITask::IsStopRequested).
    virtual bool XTOK_SLOT_CALL Run() = 0;
};

/// A task created by IMultiTask2::CreateTask. Owned by the host: it stays
/// valid until a StopTask on it returns true, after which the host has freed
/// it. The plug-in never calls Destroy on it.
class ITask {
public:
    /// slot 0
    virtual void* XTOK_SLOT_CALL Destroy(unsigned flags) = 0;
    /// slot 1
    virtual int32_t XTOK_SLOT_CALL Reserved1() = 0;
    /// slot 2: true once StopTask has asked the task to end. Called from the
    /// task's own thread, inside IRunnable::Run.
    virtual bool XTOK_SLOT_CALL IsStopRequested() = 0;
    /// slot 3
    virtual int32_t XTOK_SLOT_CALL Reserved3() = 0;
    /// slot 4: starts the body's Run on the task's thread. Called once.
    virtual bool XTOK_SLOT_CALL Start() = 0;
};

/// A recursive lock created by IMultiTask2::CreateMutex and destroyed by
/// IMultiTask2::DestroyMutex (never by its own Destroy).
class IMutex {
public:
    /// slot 0
    virtual void* XTOK_SLOT_CALL Destroy(unsigned flags) = 0;
    /// slot 1: blocks until held; the holder may lock again.
    virtual void XTOK_SLOT_CALL Lock() = 0;
    /// slot 2: true when the lock was taken without waiting.
    virtual bool XTOK_SLOT_CALL TryLock() = 0;
    /// slot 3: undoes one Lock or successful TryLock of the calling thread.
    virtual void XTOK_SLOT_CALL Unlock() = 0;
};

/// "IMultiTask2": tasks, locks and sleep.
class IMultiTask2 : public IHostService {
public:
    /// slot 4
    virtual int32_t XTOK_SLOT_CALL Reserved4() = 0;
    /// slot 5: asks the task to stop and waits up to `timeoutMs` for its Run
    /// to return. True when it ended (the handle is then freed by the host);
    /// false on time-out (the handle stays valid; the task goes on).
    virtual bool XTOK_SLOT_CALL StopTask(ITask* task, int32_t timeoutMs) = 0;
    /// slot 6: a new recursive lock; the plug-in passes flags 0. Null on failure.
    virtual IMutex* XTOK_SLOT_CALL CreateMutex(int32_t flags) = 0;
    /// slot 7: destroys a lock made by CreateMutex. It must not be held.
    virtual void XTOK_SLOT_CALL DestroyMutex(IMutex* mutex) = 0;
    /// slot 8: suspends the calling thread; 0 yields the processor.
    virtual void XTOK_SLOT_CALL Sleep(int32_t ms) = 0;
    /// slots 9-11
    virtual int32_t XTOK_SLOT_CALL Reserved9() = 0;
    virtual int32_t XTOK_SLOT_CALL Reserved10() = 0;
    virtual int32_t XTOK_SLOT_CALL Reserved11() = 0;
    /// slot 12: a new task, not yet running, that will call body->Run on its
    /// own thread once started. Priority and flags are the host's to
    /// interpret. Null when no task can be made.
    virtual ITask* XTOK_SLOT_CALL CreateTask(IRunnable* body, int32_t priority, int32_t flags) = 0;
};

/// A serial port opened by ISerialFactory::Open, closed (and freed) by
/// ISerialFactory::Close. One reader thread and one writer thread may use it
/// at the same time.
class ISerialPort {
public:
    /// slot 0
    virtual void* XTOK_SLOT_CALL Destroy(unsigned flags) = 0;
    /// slots 1-3
    virtual int32_t XTOK_SLOT_CALL Reserved1() = 0;
    virtual int32_t XTOK_SLOT_CALL Reserved2() = 0;
    virtual int32_t XTOK_SLOT_CALL Reserved3() = 0;
    /// slot 4: applies the line settings. parity: 0 none, 1 even, 2 odd,
    /// 3 mark, 4 space. mode: 0 RS-232, 1 RS-485, 2 RS-422, 3 RS-485P.
    virtual bool XTOK_SLOT_CALL Configure(int32_t baud, int32_t parity, int32_t bits, int32_t stop,
                                          int32_t mode) = 0;
    /// slot 5
    virtual int32_t XTOK_SLOT_CALL Reserved5() = 0;
    /// slot 6: waits up to `timeoutMs` for one byte. True with the byte in
    /// *destination when one arrived; false on time-out or when the line is
    /// gone. The plug-in passes flags 0.
    virtual bool XTOK_SLOT_CALL ReadByte(uint8_t* destination, int32_t timeoutMs,
                                         int32_t flags) = 0;
    /// slot 7: sends `length` bytes; the buffer stays the caller's.
    virtual bool XTOK_SLOT_CALL Write(const uint8_t* data, int32_t length, int32_t flags) = 0;
};

/// "ISerialFactory": opens serial ports by name ("com1" ... or a device path).
class ISerialFactory : public IHostService {
public:
    /// slot 4: the open port, or null when it cannot be opened.
    virtual ISerialPort* XTOK_SLOT_CALL Open(const char* name) = 0;
    /// slot 5: closes and frees a port returned by Open.
    virtual void XTOK_SLOT_CALL Close(ISerialPort* port) = 0;
};

/// "IPermanentStorage": typed values kept across restarts, by section and
/// key. Each write is durable on return.
class IPermanentStorage : public IHostService {
public:
    /// slot 4
    virtual bool XTOK_SLOT_CALL WriteText(const char* section, const char* key,
                                          const char* text) = 0;
    /// slot 5
    virtual bool XTOK_SLOT_CALL WriteBool(const char* section, const char* key, bool value) = 0;
    /// slot 6
    virtual bool XTOK_SLOT_CALL WriteInt(const char* section, const char* key, int32_t value) = 0;
    /// slot 7: the stored text, or "" when none. The text belongs to the
    /// storage and stays valid until the next call on it from the same thread.
    virtual const char* XTOK_SLOT_CALL ReadText(const char* section, const char* key) = 0;
    /// slot 8: the stored value, false when none.
    virtual bool XTOK_SLOT_CALL ReadBool(const char* section, const char* key) = 0;
    /// slot 9: the stored value, 0 when none.
    virtual int32_t XTOK_SLOT_CALL ReadInt(const char* section, const char* key) = 0;
    /// slot 10: whether a value is stored under section and key.
    virtual bool XTOK_SLOT_CALL IsStored(const char* section, const char* key) = 0;
};

/// "IPermanentStorage2", reached through slot 1 of IPermanentStorage.
class IPermanentStorage2 : public IPermanentStorage {
public:
    /// slots 11-13
    virtual int32_t XTOK_SLOT_CALL Reserved11() = 0;
    virtual int32_t XTOK_SLOT_CALL Reserved12() = 0;
    virtual int32_t XTOK_SLOT_CALL Reserved13() = 0;
    /// slot 14: copies the stored text with its zero into `buffer` of `size`
    /// bytes. False when nothing is stored or the text does not fit.
    virtual bool XTOK_SLOT_CALL ReadTextTo(const char* section, const char* key, char* buffer,
                                           int32_t size) = 0;
};

/// Services the plug-in holds but never calls beyond the four common slots.
class ISocketFactory : public IHostService {};
class ICDSBuffer : public IHostService {};
class IDiag : public IHostService {};
class IDriverInterface : public IHostService {};
class ISmux : public IHostService {};
class IFastTimer : public IHostService {};

}  // namespace xtok
