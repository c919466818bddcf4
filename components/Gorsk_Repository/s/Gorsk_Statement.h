// Gorsk::Statement: one prepared SQLite statement, finalized on destruction. Binding and
// column access use the 1-based and 0-based indexes of SQLite. Failures are kept: once a call
// fails, the statement answers every later one with that failure, so a caller may bind and
// step in a row and look at Result once. Owned by the function that runs it.
#ifndef GORSK_STATEMENT_H
#define GORSK_STATEMENT_H
#include <cstdint>
#include <string>

#include "Gorsk_Status.h"

struct sqlite3;
struct sqlite3_stmt;

namespace Gorsk {

class Statement {
public:
    Statement(sqlite3* db, const char* sql);
    ~Statement();
    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;

    // The bytes are not copied: they must stay as they are until the statement is done.
    void BindBlob(int index, const std::string& bytes);
    void BindBlob(int index, std::string&& bytes) = delete;
    void BindInt64(int index, std::int64_t value);
    // True while a row is there to read; false at the end and after a failure.
    bool Step();
    // Runs a statement that yields no row to read.
    Status Run();

    std::int64_t ColumnInt64(int column) const;
    std::string ColumnBlob(int column) const;

    // kOk, or the first failure in the terms of Gorsk::Status.
    Status Result() const;
    // The status for an SQLite result code.
    static Status FromSqlite(int code);

private:
    void Fail(int code);

    sqlite3_stmt* m_statement;  // owned; null when preparing failed
    int m_code;                 // SQLITE_OK, or the first failure
};

}  // namespace Gorsk

#endif
