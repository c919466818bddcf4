// Qmx_CorrEvent: the two process-wide deletion events. A host derives a listener from
// Listener1<T> and adds it to an emitter to learn when a manager (Qmx_CorrMgr*) or a container
// (Qmx_CorrContainer*) goes away; the emitter keeps pointers and owns no listener. The library
// fires the manager event at the start of a manager's destructor and the container event at
// the start of every managed container's destructor, while what they name is still intact.
// No locking: listeners are added, removed and notified on the thread that uses the databases.
#ifndef QMX_CORREVENT_H
#define QMX_CORREVENT_H
#include <algorithm>
#include <vector>

#include "QmxCorrExport.h"

class Qmx_CorrMgr;
class Qmx_CorrContainer;

namespace Qmx_CorrEvent {

template <class T>
class Listener1 {
public:
    virtual ~Listener1() = default;
    virtual void Notify(T subject) = 0;
};

template <class T>
class Emitter1 {
public:
    // A listener added twice is notified twice.
    void AddListener(Listener1<T>* listener) { m_listeners.push_back(listener); }
    // Removes the first entry of `listener`; one that is not there is ignored.
    void RemoveListener(Listener1<T>* listener) {
        auto it = std::find(m_listeners.begin(), m_listeners.end(), listener);
        if (it != m_listeners.end()) m_listeners.erase(it);
    }
    const std::vector<Listener1<T>*>& GetListeners() const { return m_listeners; }

    // Front to back. REQUIRES: no listener adds or removes listeners while it is notified.
    void Fire(T subject) const {
        for (Listener1<T>* listener : m_listeners) listener->Notify(subject);
    }

private:
    std::vector<Listener1<T>*> m_listeners;  // not owned, in the order they were added
};

// Made empty on first request and never destroyed, so that objects destroyed late in the
// process can still fire.
QMX_CORR_EXPORT Emitter1<Qmx_CorrMgr*>& GetCorrMgrDeletedEmitter();
QMX_CORR_EXPORT Emitter1<Qmx_CorrContainer*>& GetCorrContainerDeletedEmitter();

}  // namespace Qmx_CorrEvent

#endif
