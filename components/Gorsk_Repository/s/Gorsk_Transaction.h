// Gorsk::Transaction: one write transaction on a connection, for the scope of the object. It
// begins at once with the write lock (BEGIN IMMEDIATE, waiting as the busy timeout allows),
// so that what it checks cannot change before it writes. Destroyed without Commit, it rolls
// back. Owned by the function that changes the repository.
#ifndef GORSK_TRANSACTION_H
#define GORSK_TRANSACTION_H
#include "Gorsk_Status.h"

struct sqlite3;

namespace Gorsk {

class Transaction {
public:
    explicit Transaction(sqlite3* db);
    ~Transaction();
    Transaction(const Transaction&) = delete;
    Transaction& operator=(const Transaction&) = delete;

    // kOk when the transaction has begun.
    Status Begun() const { return m_begun; }
    // Makes the changes durable; kOk on success. Anything else leaves nothing changed.
    Status Commit();

private:
    sqlite3* m_db;   // not owned
    Status m_begun;  // result of BEGIN
    bool m_open;     // begun and neither committed nor rolled back
};

}  // namespace Gorsk

#endif
