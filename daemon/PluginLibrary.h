#pragma once
// PluginLibrary: the HID service plug-in library, loaded as a host loads it: dlopen, then the one
// exported factory by name. Each plug-in instance the daemon runs comes from this factory.

#include <string>

#include "tolkatouch/HIDServicePlugin.h"

namespace TolkaTouch {

class PluginLibrary {
public:
    // Throws std::runtime_error with a one-line message when the library cannot be loaded or
    // lacks the factory.
    explicit PluginLibrary(const std::string& path);
    ~PluginLibrary();
    PluginLibrary(const PluginLibrary&) = delete;
    PluginLibrary& operator=(const PluginLibrary&) = delete;

    const std::string& path() const { return _path; }

    // A new service's plug-in interface handle holding one reference (the caller's), or null when
    // the factory refuses.
    Host::PlugInInterface** createService() const;

private:
    std::string _path;
    void* _handle = nullptr;
    Host::PlugInFactoryFunction _factory = nullptr;
};

}  // namespace TolkaTouch
