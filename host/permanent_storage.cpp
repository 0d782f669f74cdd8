#include "host/permanent_storage.h"

#include <sqlite3.h>

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <system_error>

namespace xtok::host {

namespace {

// One row per value. `kind` says which column holds it, for whoever looks at
// the file; a read of the other type finds NULL there and answers its zero.
constexpr const char* kSchema =
    "CREATE TABLE IF NOT EXISTS retained ("
    " section TEXT NOT NULL, key TEXT NOT NULL,"
    " kind TEXT NOT NULL CHECK (kind IN ('int', 'bool', 'text')),"
    " \"int\" INTEGER, \"text\" TEXT,"
    " PRIMARY KEY (section, key))";

// A write-ahead log with full syncs: a transaction is on disk when it
// commits, and a kill at any point leaves the state of the last commit.
constexpr const char* kPragmas = "PRAGMA journal_mode=WAL; PRAGMA synchronous=FULL";

constexpr const char* kUpsert =
    "INSERT OR REPLACE INTO retained (section, key, kind, \"int\", \"text\")"
    " VALUES (?1, ?2, ?3, ?4, ?5)";
constexpr const char* kSelect =
    "SELECT \"int\", \"text\" FROM retained WHERE section = ?1 AND key = ?2";
constexpr const char* kList =
    "SELECT key, kind, \"int\", \"text\" FROM retained WHERE section = ?1 ORDER BY key";
constexpr const char* kClear = "DELETE FROM retained WHERE section = ?1";

// A second host on the same file holds its lock only for one short write.
constexpr int kBusyTimeoutMs = 2000;

bool createParent(const std::string& path, std::string& error) {
    std::filesystem::path parent = std::filesystem::path(path).parent_path();
    std::error_code code;
    if (!parent.empty() && !std::filesystem::create_directories(parent, code) && code) {
        error = "cannot create directory " + parent.string() + ": " + code.message();
        return false;
    }
    return true;
}

/// Binds section and key; false for a null one, which is never stored.
bool bindName(sqlite3_stmt* statement, const char* section, const char* key) {
    return section && key &&
           sqlite3_bind_text(statement, 1, section, -1, SQLITE_TRANSIENT) == SQLITE_OK &&
           sqlite3_bind_text(statement, 2, key, -1, SQLITE_TRANSIENT) == SQLITE_OK;
}

std::string shownValue(sqlite3_stmt* row) {
    const unsigned char* kindColumn = sqlite3_column_text(row, 1);
    const std::string kind = kindColumn ? reinterpret_cast<const char*>(kindColumn) : "";
    if (kind == "text") {
        const unsigned char* text = sqlite3_column_text(row, 3);
        return "\"" + std::string(text ? reinterpret_cast<const char*>(text) : "") + "\"";
    }
    const int64_t number = sqlite3_column_int64(row, 2);
    return kind == "bool" ? (number ? "true" : "false") : std::to_string(number);
}

}  // namespace

std::string defaultStoragePath() {
    const char* state = std::getenv("XDG_STATE_HOME");
    if (state && *state) {
        return std::string(state) + "/xtokline/retained.sqlite3";
    }
    const char* home = std::getenv("HOME");
    if (home && *home) {
        return std::string(home) + "/.local/state/xtokline/retained.sqlite3";
    }
    return "";
}

PermanentStorage::PermanentStorage(sqlite3* db, std::string path)
    : HostService("IPermanentStorage"), db_(db), path_(std::move(path)) {}

PermanentStorage::~PermanentStorage() {
    sqlite3_finalize(upsert_);
    sqlite3_finalize(select_);
    sqlite3_close(db_);
}

std::unique_ptr<PermanentStorage> PermanentStorage::open(const std::string& path,
                                                         std::string& error) {
    if (path.empty()) {
        error = "no file for the permanent storage (neither XDG_STATE_HOME nor HOME is set)";
        return nullptr;
    }
    if (!createParent(path, error)) {
        return nullptr;
    }
    sqlite3* db = nullptr;
    int result =
        sqlite3_open_v2(path.c_str(), &db, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE, nullptr);
    // The handle exists even when opening failed and is freed by the object.
    std::unique_ptr<PermanentStorage> storage(new PermanentStorage(db, path));
    if (result != SQLITE_OK || !storage->prepare()) {
        error = "cannot use " + path +
                " as permanent storage: " + (db ? sqlite3_errmsg(db) : "out of memory");
        return nullptr;
    }
    // SQLite opens a write-protected file read-only without a word; every
    // write would fail later, far from the cause.
    if (!storage->writable()) {
        error = "cannot use " + path + " as permanent storage: it is read-only";
        return nullptr;
    }
    return storage;
}

bool PermanentStorage::prepare() {
    sqlite3_busy_timeout(db_, kBusyTimeoutMs);
    return sqlite3_exec(db_, kPragmas, nullptr, nullptr, nullptr) == SQLITE_OK &&
           sqlite3_exec(db_, kSchema, nullptr, nullptr, nullptr) == SQLITE_OK &&
           sqlite3_prepare_v2(db_, kUpsert, -1, &upsert_, nullptr) == SQLITE_OK &&
           sqlite3_prepare_v2(db_, kSelect, -1, &select_, nullptr) == SQLITE_OK;
}

bool PermanentStorage::writable() const {
    return sqlite3_db_readonly(db_, "main") == 0;
}

void* PermanentStorage::GetInterface(const char* name) {
    if (name && std::strcmp(name, "IPermanentStorage2") == 0) {
        return static_cast<IPermanentStorage2*>(this);
    }
    return HostService::GetInterface(name);
}

bool PermanentStorage::write(const char* section, const char* key, const char* kind, int64_t number,
                             const char* text) {
    std::lock_guard<std::mutex> lock(mutex_);
    // Cleared bindings are NULL, so only the value's own column is bound.
    bool bound = bindName(upsert_, section, key) &&
                 sqlite3_bind_text(upsert_, 3, kind, -1, SQLITE_STATIC) == SQLITE_OK &&
                 (text ? sqlite3_bind_text(upsert_, 5, text, -1, SQLITE_TRANSIENT)
                       : sqlite3_bind_int64(upsert_, 4, number)) == SQLITE_OK;
    bool done = bound && sqlite3_step(upsert_) == SQLITE_DONE;
    if (!done && failure_.empty()) {
        failure_ = sqlite3_errmsg(db_);
    }
    sqlite3_reset(upsert_);
    sqlite3_clear_bindings(upsert_);
    return done;
}

// Deferred: the file is locked by the first write, so that a call which
// retains nothing neither waits for nor fails on another program's lock.
bool PermanentStorage::begin(std::string& error) {
    std::lock_guard<std::mutex> lock(mutex_);
    failure_.clear();
    if (sqlite3_exec(db_, "BEGIN", nullptr, nullptr, nullptr) != SQLITE_OK) {
        error = sqlite3_errmsg(db_);
        return false;
    }
    return true;
}

bool PermanentStorage::commit(std::string& error) {
    std::lock_guard<std::mutex> lock(mutex_);
    const bool keep = failure_.empty();
    if (sqlite3_exec(db_, keep ? "COMMIT" : "ROLLBACK", nullptr, nullptr, nullptr) == SQLITE_OK &&
        keep) {
        return true;
    }
    error = keep ? sqlite3_errmsg(db_) : failure_;
    sqlite3_exec(db_, "ROLLBACK", nullptr, nullptr, nullptr);  // a failed COMMIT leaves it open
    return false;
}

bool PermanentStorage::read(const char* section, const char* key, int64_t* number,
                            std::string* text) {
    std::lock_guard<std::mutex> lock(mutex_);
    bool found = bindName(select_, section, key) && sqlite3_step(select_) == SQLITE_ROW;
    if (found && number) {
        *number = sqlite3_column_int64(select_, 0);
    }
    if (found && text) {
        const unsigned char* column = sqlite3_column_text(select_, 1);
        text->assign(column ? reinterpret_cast<const char*>(column) : "");
    }
    sqlite3_reset(select_);
    sqlite3_clear_bindings(select_);
    return found;
}

bool PermanentStorage::WriteText(const char* section, const char* key, const char* text) {
    return text && write(section, key, "text", 0, text);
}

bool PermanentStorage::WriteBool(const char* section, const char* key, bool value) {
    return write(section, key, "bool", value ? 1 : 0, nullptr);
}

bool PermanentStorage::WriteInt(const char* section, const char* key, int32_t value) {
    return write(section, key, "int", value, nullptr);
}

const char* PermanentStorage::ReadText(const char* section, const char* key) {
    thread_local std::string text;
    if (!read(section, key, nullptr, &text)) {
        text.clear();
    }
    return text.c_str();
}

bool PermanentStorage::ReadBool(const char* section, const char* key) {
    int64_t number = 0;
    return read(section, key, &number, nullptr) && number != 0;
}

int32_t PermanentStorage::ReadInt(const char* section, const char* key) {
    int64_t number = 0;
    return read(section, key, &number, nullptr) ? static_cast<int32_t>(number) : 0;
}

bool PermanentStorage::IsStored(const char* section, const char* key) {
    return read(section, key, nullptr, nullptr);
}

bool PermanentStorage::ReadTextTo(const char* section, const char* key, char* buffer,
                                  int32_t size) {
    std::string text;
    if (!buffer || size <= 0 || !read(section, key, nullptr, &text) ||
        text.size() >= static_cast<std::size_t>(size)) {
        return false;
    }
    std::memcpy(buffer, text.c_str(), text.size() + 1);
    return true;
}

bool PermanentStorage::list(const std::string& section, std::vector<StoredEntry>& values,
                            std::string& error) {
    std::lock_guard<std::mutex> lock(mutex_);
    sqlite3_stmt* query = nullptr;
    int result = sqlite3_prepare_v2(db_, kList, -1, &query, nullptr);
    if (result == SQLITE_OK) {
        sqlite3_bind_text(query, 1, section.c_str(), -1, SQLITE_TRANSIENT);
        while ((result = sqlite3_step(query)) == SQLITE_ROW) {
            const unsigned char* key = sqlite3_column_text(query, 0);
            values.push_back({key ? reinterpret_cast<const char*>(key) : "", shownValue(query)});
        }
    }
    if (result != SQLITE_DONE) {
        error = sqlite3_errmsg(db_);
    }
    sqlite3_finalize(query);
    return result == SQLITE_DONE;
}

bool PermanentStorage::clear(const std::string& section, std::string& error) {
    std::lock_guard<std::mutex> lock(mutex_);
    sqlite3_stmt* statement = nullptr;
    int result = sqlite3_prepare_v2(db_, kClear, -1, &statement, nullptr);
    if (result == SQLITE_OK) {
        sqlite3_bind_text(statement, 1, section.c_str(), -1, SQLITE_TRANSIENT);
        result = sqlite3_step(statement);
    }
    if (result != SQLITE_DONE) {
        error = sqlite3_errmsg(db_);
    }
    sqlite3_finalize(statement);
    return result == SQLITE_DONE;
}

}  // namespace xtok::host
