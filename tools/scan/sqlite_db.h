// A small owner of a SQLite connection and its prepared statements: errors
// become exceptions carrying SQLite's message, so a command reports them once.
#pragma once

#include <sqlite3.h>

#include <cstdint>
#include <stdexcept>
#include <string>

namespace scan {

struct DbError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

class Statement {
public:
    Statement(sqlite3* db, const char* sql);
    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;
    ~Statement();

    // Binds from 1; an empty optional text or blob binds NULL.
    Statement& Bind(int at, int64_t v);
    Statement& Bind(int at, double v);
    Statement& Bind(int at, const std::string& text);
    Statement& BindBlob(int at, const std::string& bytes);
    Statement& BindNull(int at);
    // True while a row is there to read; false when done.
    bool Step();
    // Runs a statement that returns no row, then resets it for its next use.
    void Run();
    void Reset();

    bool IsNull(int column) const;
    int64_t Int(int column) const;
    std::string Text(int column) const;  // text or blob bytes; empty for NULL

private:
    sqlite3* db_;
    sqlite3_stmt* stmt_ = nullptr;
};

class Db {
public:
    // create: make the file when missing (a scan); otherwise it must exist.
    Db(const std::string& path, bool create);
    Db(const Db&) = delete;
    Db& operator=(const Db&) = delete;
    ~Db();

    void Exec(const char* sql);
    int64_t LastId() const { return sqlite3_last_insert_rowid(db_); }
    sqlite3* Handle() const { return db_; }

private:
    sqlite3* db_ = nullptr;
};

}  // namespace scan
