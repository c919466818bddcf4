// Qmx_CorrNameHandle: the name of a container or item as a small value: one pointer to a name
// record of a name repository. Copying a handle copies the pointer only; references are taken
// and given back through the repository (CopyName, ReleaseName, DiscardName), and handles are
// compared and ordered through it too (IsEqual, IsLess), never by their pointers. A default
// handle points to no record and is invalid for every repository.
#ifndef QMX_CORRNAMEHANDLE_H
#define QMX_CORRNAMEHANDLE_H

class Qmx_CorrName;

class Qmx_CorrNameHandle {
public:
    Qmx_CorrNameHandle() = default;
    explicit Qmx_CorrNameHandle(Qmx_CorrName* record) : m_record(record) {}

    // The record, not owned; null for a default handle.
    Qmx_CorrName* GetRecord() const { return m_record; }

private:
    Qmx_CorrName* m_record = nullptr;
};

#endif
