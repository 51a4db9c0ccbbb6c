// The plug-in library's one exported symbol: the host's way in.
#include "tolkatouch/HIDServicePlugin.h"
#include "plugin/TolkaTouchHIDService.h"

using TolkaTouch::TolkaTouchHIDService;

extern "C" void* TolkaTouchHIDServiceFactory(void*, TolkaTouch::Host::UUIDBytes typeID) {
    if (!(typeID == TolkaTouch::Host::kHIDServicePlugInTypeID)) return nullptr;
    try {
        auto* service = new TolkaTouchHIDService();  // the factory's own reference
        service->retain();                           // the host's, given back through Release
        void* plugin = service->getPluginInterface();
        service->release();
        return plugin;
    } catch (...) {
        return nullptr;
    }
}
