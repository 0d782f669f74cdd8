// "IPermanentStorage" / "IPermanentStorage2": typed values in one SQLite file.
#pragma once

#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "host/host_service.h"

struct sqlite3;
struct sqlite3_stmt;

namespace xtok::host {

/// $XDG_STATE_HOME/xtokline/retained.sqlite3, else
/// ~/.local/state/xtokline/retained.sqlite3; "" when neither variable is set.
std::string defaultStoragePath();

/// A stored value for people: its key and its value as a number, true or
/// false, or a quoted text.
struct StoredEntry {
    std::string key;
    std::string shown;
};

class PermanentStorage final : public HostService<IPermanentStorage2> {
public:
    /// Opens or creates the file, and its directory. Null with `error` set
    /// when that fails or the file is not one of ours.
    static std::unique_ptr<PermanentStorage> open(const std::string& path, std::string& error);
    ~PermanentStorage();

    void* GetInterface(const char* name) override;
    bool WriteText(const char* section, const char* key, const char* text) override;
    bool WriteBool(const char* section, const char* key, bool value) override;
    bool WriteInt(const char* section, const char* key, int32_t value) override;
    const char* ReadText(const char* section, const char* key) override;
    bool ReadBool(const char* section, const char* key) override;
    int32_t ReadInt(const char* section, const char* key) override;
    bool IsStored(const char* section, const char* key) override;
    int32_t Reserved11() override { return 0; }
    int32_t Reserved12() override { return 0; }
    int32_t Reserved13() override { return 0; }
    bool ReadTextTo(const char* section, const char* key, char* buffer, int32_t size) override;

    /// Makes the writes until commit() one transaction, so that a crash
    /// keeps all of them or none. False with the reason (the file locked past
    /// the busy wait, ...).
    bool begin(std::string& error);
    /// Keeps the transaction's writes; when one of them failed, or keeping
    /// them does, none is kept: false with the first reason.
    bool commit(std::string& error);

    /// The values of `section` by key. False with the reason.
    bool list(const std::string& section, std::vector<StoredEntry>& values, std::string& error);
    /// Forgets every value of `section`. False with the reason.
    bool clear(const std::string& section, std::string& error);
    const std::string& path() const { return path_; }

private:
    PermanentStorage(sqlite3* db, std::string path);
    /// Settings, table and statements; false with the reason in sqlite3_errmsg.
    bool prepare();
    bool writable() const;
    bool write(const char* section, const char* key, const char* kind, int64_t number,
               const char* text);
    /// Reads one value; false when none is stored (or on a database error).
    bool read(const char* section, const char* key, int64_t* number, std::string* text);

    std::mutex mutex_;
    sqlite3* db_;
    std::string path_;
    sqlite3_stmt* upsert_ = nullptr;
    sqlite3_stmt* select_ = nullptr;
    std::string failure_;  ///< the first failed write of the transaction
};

}  // namespace xtok::host
