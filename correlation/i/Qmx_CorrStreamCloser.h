// Qmx_CorrStreamCloser: gives a stream back to the database that opened it when the scope
// ends, thrown through or not. A null stream is left alone. A short-lived local object.
#ifndef QMX_CORRSTREAMCLOSER_H
#define QMX_CORRSTREAMCLOSER_H
#include "Qmx_CorrDb.h"

class Qmx_CorrStream;

class Qmx_CorrStreamCloser {
public:
    Qmx_CorrStreamCloser(Qmx_CorrDb* db, Qmx_CorrStream* stream) : m_db(db), m_stream(stream) {}
    ~Qmx_CorrStreamCloser() {
        if (m_stream) m_db->CloseStream(m_stream);
    }
    Qmx_CorrStreamCloser(const Qmx_CorrStreamCloser&) = delete;
    Qmx_CorrStreamCloser& operator=(const Qmx_CorrStreamCloser&) = delete;

    Qmx_CorrStream* Get() const { return m_stream; }

private:
    Qmx_CorrDb* m_db;
    Qmx_CorrStream* m_stream;  // not owned
};

#endif
