#include "Gorsk_Statement.h"

#include <sqlite3.h>

namespace Gorsk {

Statement::Statement(sqlite3* db, const char* sql) : m_statement(nullptr), m_code(SQLITE_OK) {
    Fail(sqlite3_prepare_v2(db, sql, -1, &m_statement, nullptr));
}

Statement::~Statement() { sqlite3_finalize(m_statement); }

void Statement::BindBlob(int index, const std::string& bytes) {
    if (m_code != SQLITE_OK) return;
    // A null pointer would bind NULL; data() of a std::string never is one, so an empty
    // string binds the empty blob.
    Fail(sqlite3_bind_blob64(m_statement, index, bytes.data(), bytes.size(), SQLITE_STATIC));
}

void Statement::BindInt64(int index, std::int64_t value) {
    if (m_code != SQLITE_OK) return;
    Fail(sqlite3_bind_int64(m_statement, index, value));
}

bool Statement::Step() {
    if (m_code != SQLITE_OK) return false;
    const int code = sqlite3_step(m_statement);
    if (code == SQLITE_ROW) return true;
    if (code != SQLITE_DONE) Fail(code);
    return false;
}

Status Statement::Run() {
    while (Step()) {
    }
    return Result();
}

std::int64_t Statement::ColumnInt64(int column) const {
    return sqlite3_column_int64(m_statement, column);
}

std::string Statement::ColumnBlob(int column) const {
    const void* bytes = sqlite3_column_blob(m_statement, column);
    const int size = sqlite3_column_bytes(m_statement, column);
    // An empty blob comes back as a null pointer.
    if (!bytes || size <= 0) return std::string();
    return std::string(static_cast<const char*>(bytes), static_cast<std::size_t>(size));
}

Status Statement::Result() const { return FromSqlite(m_code); }

Status Statement::FromSqlite(int code) {
    switch (code & 0xFF) {
        case SQLITE_OK:
        case SQLITE_ROW:
        case SQLITE_DONE:
            return Status::kOk;
        case SQLITE_NOTADB:
        case SQLITE_CORRUPT:
            return Status::kInvalidFormat;
        case SQLITE_READONLY:
            return Status::kReadOnly;
        case SQLITE_TOOBIG:
            return Status::kTooLarge;
        case SQLITE_CANTOPEN:
            return Status::kNotFound;
        default:
            return Status::kStoreError;
    }
}

void Statement::Fail(int code) {
    if (m_code == SQLITE_OK && code != SQLITE_OK) m_code = code;
}

}  // namespace Gorsk
