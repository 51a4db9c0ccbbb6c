#include "daemon/PluginLibrary.h"

#include <dlfcn.h>

#include <stdexcept>

namespace TolkaTouch {

PluginLibrary::PluginLibrary(const std::string& path) : _path(path) {
    _handle = ::dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (!_handle) {
        const char* reason = ::dlerror();
        throw std::runtime_error("cannot load the plug-in " + path + ": " + (reason ? reason : "unknown error"));
    }
    void* symbol = ::dlsym(_handle, Host::kFactorySymbol);
    if (!symbol) {
        ::dlclose(_handle);
        throw std::runtime_error("the plug-in " + path + " has no " + Host::kFactorySymbol);
    }
    _factory = reinterpret_cast<Host::PlugInFactoryFunction>(symbol);
}

PluginLibrary::~PluginLibrary() {
    ::dlclose(_handle);
}

Host::PlugInInterface** PluginLibrary::createService() const {
    return static_cast<Host::PlugInInterface**>(_factory(nullptr, Host::kHIDServicePlugInTypeID));
}

}  // namespace TolkaTouch
