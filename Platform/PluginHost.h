#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string>

#include "Host/HIDServicePlugIn.h"
#include "Platform/DispatchQueue.h"

namespace ZeltoTouch::Platform {

// What the host event system does with a HID service plug-in: loads the module, creates the
// service through its factory, and drives it through the plug-in and service interface tables.
// Events from the service arrive on the host's serial queue and go to the event sink there.
//
// Lifecycle, in order: load → start(serviceHandle) → open → schedule → ... → unschedule →
// close → stop; the destructor finishes whatever the caller left undone in that order and
// releases both interface references. Not thread-safe: one caller thread drives it.
class PluginHost {
public:
    using EventSink = std::function<void(const HIDEvent& event)>;

    // Loads the module at path and asks its factory for a service. Throws std::runtime_error
    // with a message naming the path and the cause (dlerror's text, a missing factory, a factory
    // returning null, an interface the service does not offer).
    static std::unique_ptr<PluginHost> load(const std::string& path);
    ~PluginHost();

    PluginHost(const PluginHost&) = delete;
    PluginHost& operator=(const PluginHost&) = delete;

    ZeltoReturn probe(uint32_t serviceHandle, const PropertyValue& properties, int32_t& score);
    ZeltoReturn start(uint32_t serviceHandle, const PropertyValue& properties = {});
    bool open(uint32_t options = 0);
    // Sets the event callback (to this host's event sink) and schedules the service on the queue.
    void schedule(EventSink sink);
    void unschedule();
    void close(uint32_t options = 0);
    ZeltoReturn stop();

    PropertyValue copyProperty(const PropertyValue& key);
    bool setProperty(const PropertyValue& key, const PropertyValue& value);

    DispatchQueue& queue() noexcept { return *_queue; }
    void* serviceInterface() const noexcept { return _service; }

private:
    PluginHost(void* module, void* plugin, void* service);

    static void eventCallback(void* target, void* refcon, void* sender, HIDEvent* event, uint32_t options);

    ZeltoHIDServicePlugInInterface& pluginTable() const { return **static_cast<ZeltoHIDServicePlugInInterface**>(_plugin); }
    ZeltoHIDServiceInterface& serviceTable() const { return **static_cast<ZeltoHIDServiceInterface**>(_service); }

    void* _module;
    void* _plugin;   // plug-in interface pointer; one reference
    void* _service;  // service interface pointer; one reference
    std::shared_ptr<DispatchQueue> _queue;
    EventSink _sink;  // read on the queue; written only while unscheduled
    bool _started = false, _open = false, _scheduled = false;
};

}  // namespace ZeltoTouch::Platform
