#include "ModuleHandle.h"

#include <dlfcn.h>

ModuleHandle::ModuleHandle(std::string const& path) {
    handle_ = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (handle_ == nullptr) {
        error_ = dlerror();
        return;
    }
    auto find = [&](char const* name) -> void* {
        void* symbol = dlsym(handle_, name);
        if (symbol == nullptr) error_ += std::string("missing ") + name + "; ";
        return symbol;
    };
    getComponents = reinterpret_cast<GetComponents>(find("getComponents"));
    sourceFactory = reinterpret_cast<Factory>(find("FacebookSource_component"));
    connectorFactory = reinterpret_cast<Factory>(find("FacebookConnector_component"));
}

ModuleHandle::~ModuleHandle() {
    if (handle_ != nullptr) dlclose(handle_);
}
