#include "Qmx_CorrNameRepository.h"

Qmx_CorrNameRepository::~Qmx_CorrNameRepository() = default;

bool Qmx_CorrNameRepository::NamesStoredText(Qmx_CorrNameHandle name) {
    if (!GetString(name).empty()) return true;
    const Qmx_CorrNameHandle empty = CreateName(Vesk::StringBase<char>());
    const bool stored = IsEqual(name, empty);
    ReleaseName(empty);
    return stored;
}
