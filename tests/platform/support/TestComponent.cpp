// A component for the factory's tests: it makes one class, whose instance answers the
// interface query for its own identifier and nothing else.
#include "BrokI_IInterface.h"
#include "BrokP_Factory.h"

namespace {

class Greeter : public BrokI::IInterface {
public:
    BrokI::IInterface* QueryInterface(const Vesk::ClassId& interfaceId) override {
        return interfaceId == Vesk::ClassId("0A1B2C3D-0000-4000-8000-00000000BEEF") ? this
                                                                                    : nullptr;
    }
};

}  // namespace

extern "C" __attribute__((visibility("default"))) BrokI::IInterface* BrokP_CreateInstance(
    const Vesk::ClassId* classId) {
    static Greeter greeter;
    if (classId && *classId == Vesk::ClassId("0a1b2c3d-0000-4000-8000-00000000beef")) {
        return &greeter;
    }
    return nullptr;
}
