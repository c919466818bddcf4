// Gorsk::IDisposable: the lifetime interface of an object with one owner, the client that
// made it through the component factory. Dispose closes what the object still has open and
// destroys it; no interface of it may be used afterwards.
#ifndef GORSK_IDISPOSABLE_H
#define GORSK_IDISPOSABLE_H
#include "Gorsk_IObject.h"

namespace Gorsk {

constexpr const char* kIDisposableId = "bd2ef88a-5603-447a-9874-f05b21cd99fe";

class IDisposable : public IObject {
public:
    virtual void Dispose() = 0;

protected:
    ~IDisposable() override = default;
};

}  // namespace Gorsk

#endif
