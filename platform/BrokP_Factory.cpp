#include "BrokP_Factory.h"

#include <dlfcn.h>

#include <string>
#include <vector>

#include "Vesk_Env.h"

namespace BrokP {

namespace {

struct Component {
    std::string name;
    void* handle;
    CreateInstanceFn create;
};

std::vector<Component>& Components() {
    static std::vector<Component> components;
    return components;
}

std::string OwnDirectory() {
    Dl_info info;
    if (::dladdr(reinterpret_cast<void*>(&Factory::LoadLibraryFactory), &info) == 0 ||
        !info.dli_fname) {
        return std::string();
    }
    const std::string path = info.dli_fname;
    const std::size_t slash = path.rfind('/');
    return slash == std::string::npos ? std::string() : path.substr(0, slash);
}

std::vector<std::string> Candidates(const std::string& file) {
    std::vector<std::string> candidates;
    if (const char* list = Vesk_Env::GetEnv("QMX_COMPONENT_PATH")) {
        const std::string dirs = list;
        std::size_t start = 0;
        while (start <= dirs.size()) {
            const std::size_t colon = dirs.find(':', start);
            const std::string dir =
                dirs.substr(start, colon == std::string::npos ? std::string::npos : colon - start);
            if (!dir.empty()) candidates.push_back(dir + "/" + file);
            if (colon == std::string::npos) break;
            start = colon + 1;
        }
    }
    const std::string own = OwnDirectory();
    if (!own.empty()) candidates.push_back(own + "/" + file);
    candidates.push_back(file);  // no slash: the dynamic linker's own search
    return candidates;
}

}  // namespace

bool Factory::LoadLibraryFactory(const char* name) {
    if (!name || !*name) return false;
    for (const Component& component : Components()) {
        if (component.name == name) return true;
    }
    for (const std::string& candidate : Candidates(std::string(name) + ".so")) {
        void* handle = ::dlopen(candidate.c_str(), RTLD_NOW | RTLD_LOCAL);
        if (!handle) continue;
        void* symbol = ::dlsym(handle, kCreateInstanceSymbol);
        if (!symbol) {
            ::dlclose(handle);
            continue;
        }
        Components().push_back(Component{name, handle, reinterpret_cast<CreateInstanceFn>(symbol)});
        return true;
    }
    return false;
}

BrokI::IInterface* Factory::CreateInstance(const Vesk::ClassId& classId) {
    for (const Component& component : Components()) {
        if (BrokI::IInterface* instance = component.create(&classId)) return instance;
    }
    return nullptr;
}

}  // namespace BrokP
