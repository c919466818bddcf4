// Gorsk::IRefCounted: the lifetime interface of an object with several holders. An object
// starts with one reference, its maker's; AddRef adds one for a further holder, Release gives
// one back, and the release of the last one destroys the object as IDisposable::Dispose does.
// Where an object has both interfaces, Dispose gives back the maker's reference.
#ifndef GORSK_IREFCOUNTED_H
#define GORSK_IREFCOUNTED_H
#include "Gorsk_IObject.h"

namespace Gorsk {

constexpr const char* kIRefCountedId = "f7749ab6-1dd5-4a36-97e2-aaed1ef97c6c";

class IRefCounted : public IObject {
public:
    // Both return the references left.
    virtual unsigned int AddRef() = 0;
    virtual unsigned int Release() = 0;

protected:
    ~IRefCounted() override = default;
};

}  // namespace Gorsk

#endif
