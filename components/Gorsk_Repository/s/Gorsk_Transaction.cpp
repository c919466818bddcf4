#include "Gorsk_Transaction.h"

#include <sqlite3.h>

#include "Gorsk_Statement.h"

namespace Gorsk {

Transaction::Transaction(sqlite3* db) : m_db(db), m_begun(Status::kStoreError), m_open(false) {
    m_begun = Statement(m_db, "BEGIN IMMEDIATE").Run();
    m_open = m_begun == Status::kOk;
}

Transaction::~Transaction() {
    // A failed COMMIT may already have ended the transaction; only roll back one still open.
    if (m_open && !sqlite3_get_autocommit(m_db)) {
        Statement(m_db, "ROLLBACK").Run();
    }
}

Status Transaction::Commit() {
    if (!m_open) return m_begun == Status::kOk ? Status::kBadRequest : m_begun;
    const Status status = Statement(m_db, "COMMIT").Run();
    if (status == Status::kOk) m_open = false;
    return status;
}

}  // namespace Gorsk
