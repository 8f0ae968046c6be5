#include "sqlite_db.h"

namespace scan {
namespace {

[[noreturn]] void Fail(sqlite3* db, const std::string& what) {
    throw DbError(what + ": " + (db != nullptr ? sqlite3_errmsg(db) : "out of memory"));
}

}  // namespace

Statement::Statement(sqlite3* db, const char* sql) : db_(db) {
    if (sqlite3_prepare_v2(db, sql, -1, &stmt_, nullptr) != SQLITE_OK) Fail(db, sql);
}

Statement::~Statement() { sqlite3_finalize(stmt_); }

Statement& Statement::Bind(int at, int64_t v) {
    sqlite3_bind_int64(stmt_, at, v);
    return *this;
}

Statement& Statement::Bind(int at, double v) {
    sqlite3_bind_double(stmt_, at, v);
    return *this;
}

Statement& Statement::Bind(int at, const std::string& text) {
    sqlite3_bind_text64(stmt_, at, text.data(), text.size(), SQLITE_TRANSIENT, SQLITE_UTF8);
    return *this;
}

Statement& Statement::BindBlob(int at, const std::string& bytes) {
    sqlite3_bind_blob64(stmt_, at, bytes.data(), bytes.size(), SQLITE_TRANSIENT);
    return *this;
}

Statement& Statement::BindNull(int at) {
    sqlite3_bind_null(stmt_, at);
    return *this;
}

bool Statement::Step() {
    const int rc = sqlite3_step(stmt_);
    if (rc == SQLITE_ROW) return true;
    if (rc == SQLITE_DONE) return false;
    const std::string why = std::string(sqlite3_sql(stmt_)) + ": " + sqlite3_errmsg(db_);
    sqlite3_reset(stmt_);
    throw DbError(why);
}

void Statement::Run() {
    while (Step()) {
    }
    Reset();
}

void Statement::Reset() {
    sqlite3_reset(stmt_);
    sqlite3_clear_bindings(stmt_);
}

bool Statement::IsNull(int column) const { return sqlite3_column_type(stmt_, column) == SQLITE_NULL; }

int64_t Statement::Int(int column) const { return sqlite3_column_int64(stmt_, column); }

std::string Statement::Text(int column) const {
    const void* data = sqlite3_column_blob(stmt_, column);
    const int size = sqlite3_column_bytes(stmt_, column);
    return data != nullptr ? std::string(static_cast<const char*>(data), static_cast<size_t>(size)) : std::string();
}

Db::Db(const std::string& path, bool create) {
    const int flags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX | (create ? SQLITE_OPEN_CREATE : 0);
    if (sqlite3_open_v2(path.c_str(), &db_, flags, nullptr) != SQLITE_OK) {
        const std::string why = db_ != nullptr ? sqlite3_errmsg(db_) : "out of memory";
        sqlite3_close(db_);
        db_ = nullptr;
        throw DbError(path + ": " + why);
    }
    // Another writer's commit waits this long before SQLITE_BUSY.
    sqlite3_busy_timeout(db_, 10000);
}

Db::~Db() { sqlite3_close(db_); }

void Db::Exec(const char* sql) {
    char* message = nullptr;
    if (sqlite3_exec(db_, sql, nullptr, nullptr, &message) != SQLITE_OK) {
        const std::string why = message != nullptr ? message : sqlite3_errmsg(db_);
        sqlite3_free(message);
        throw DbError(why);
    }
}

}  // namespace scan
