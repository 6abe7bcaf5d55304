// The module's only exported symbol: the host finds it by name and asks it for the plug-in.

#include <exception>

#include "Host/HIDServicePlugIn.h"
#include "Service/ZeltoTouchHIDService.h"

extern "C" __attribute__((visibility("default"))) void* ZeltoTouchHIDServiceFactory(void* allocator,
                                                                                   ZeltoUUID typeID);

extern "C" void* ZeltoTouchHIDServiceFactory(void*, ZeltoUUID typeID) {
    using namespace ZeltoTouch;
    if (!(typeID == kZeltoHIDServicePlugInTypeID)) return nullptr;
    ZeltoTouchHIDService* service = nullptr;
    try {
        service = ZeltoTouchHIDService::create();
    } catch (const std::exception& error) {
        // Nothing may cross into the host as an exception: the host sees a refusal.
        Log("HIDService").error("Failed to create the service: %s", error.what());
        return nullptr;
    }
    service->retain();   // the host's reference
    service->release();  // our creation reference
    return service->getPluginInterface();
}
