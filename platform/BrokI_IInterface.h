// BrokI::IInterface: the base of every component interface. The first operation of every
// interface is the interface query: given an interface identifier, the object's interface of
// that kind, or null. Lifetime belongs to the component (through its own interfaces); hosts
// never delete an interface pointer.
#ifndef BROKI_IINTERFACE_H
#define BROKI_IINTERFACE_H
#include "Vesk_ClassId.h"

namespace BrokI {

class IInterface {
public:
    virtual IInterface* QueryInterface(const Vesk::ClassId& interfaceId) = 0;

protected:
    virtual ~IInterface() = default;
};

}  // namespace BrokI

#endif
