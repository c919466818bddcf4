// Gorsk::IObject: the base interface of every object of the repository component. Its one
// operation, inherited from BrokI::IInterface, is the interface query: QueryInterface with an
// interface identifier returns the object's interface of that kind as its BrokI::IInterface
// base (static_cast it to the interface asked for), or null. Every object answers kIObjectId
// with one and the same pointer, its identity. Objects are made by the component and released
// through its lifetime interfaces (Gorsk_IDisposable.h, Gorsk_IRefCounted.h) or handed back
// to the object that opened them; clients never delete them. One thread at a time per object.
#ifndef GORSK_IOBJECT_H
#define GORSK_IOBJECT_H
#include "BrokI_IInterface.h"

namespace Gorsk {

constexpr const char* kIObjectId = "03984322-c4b3-4d84-996f-5f608ad04227";

class IObject : public BrokI::IInterface {
protected:
    ~IObject() override = default;
};

}  // namespace Gorsk

#endif
