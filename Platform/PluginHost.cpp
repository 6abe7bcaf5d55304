#include "Platform/PluginHost.h"

#include <dlfcn.h>
#include <stdexcept>

namespace ZeltoTouch::Platform {

namespace {

[[noreturn]] void loadFailed(const std::string& path, const std::string& cause) {
    throw std::runtime_error("Cannot load HID service plug-in \"" + path + "\": " + cause);
}

}  // namespace

std::unique_ptr<PluginHost> PluginHost::load(const std::string& path) {
    void* module = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (module == nullptr) {
        const char* error = dlerror();
        loadFailed(path, error ? error : "dlopen failed");
    }
    const auto closeAndFail = [&](const std::string& cause) {
        dlclose(module);
        loadFailed(path, cause);
    };
    dlerror();
    auto factory = reinterpret_cast<ZeltoHIDServiceFactoryFunction>(dlsym(module, kZeltoHIDServiceFactoryName));
    if (factory == nullptr) closeAndFail(std::string("no factory named ") + kZeltoHIDServiceFactoryName);

    void* plugin = factory(nullptr, kZeltoHIDServicePlugInTypeID);
    if (plugin == nullptr) closeAndFail("the factory returned no plug-in");
    auto& pluginTable = **static_cast<ZeltoHIDServicePlugInInterface**>(plugin);
    void* service = nullptr;
    if (pluginTable.QueryInterface(plugin, kZeltoHIDServiceInterfaceID, &service) != kZeltoSuccess || service == nullptr) {
        pluginTable.Release(plugin);
        closeAndFail("the plug-in offers no HID service interface");
    }
    return std::unique_ptr<PluginHost>(new PluginHost(module, plugin, service));
}

PluginHost::PluginHost(void* module, void* plugin, void* service)
    : _module(module), _plugin(plugin), _service(service), _queue(DispatchQueue::create("zelto.host.events")) {}

PluginHost::~PluginHost() {
    if (_scheduled) unschedule();
    if (_open) close();
    if (_started) stop();
    _queue->barrier();  // no event callback may run once the service is gone
    serviceTable().Release(_service);
    pluginTable().Release(_plugin);
    _queue.reset();
    dlclose(_module);
}

ZeltoReturn PluginHost::probe(uint32_t serviceHandle, const PropertyValue& properties, int32_t& score) {
    return pluginTable().Probe(_plugin, &properties, serviceHandle, &score);
}

ZeltoReturn PluginHost::start(uint32_t serviceHandle, const PropertyValue& properties) {
    const ZeltoReturn status = pluginTable().Start(_plugin, &properties, serviceHandle);
    _started = status == kZeltoSuccess;
    return status;
}

bool PluginHost::open(uint32_t options) {
    _open = serviceTable().open(_service, options);
    return _open;
}

void PluginHost::schedule(EventSink sink) {
    _sink = std::move(sink);
    serviceTable().setEventCallback(_service, &PluginHost::eventCallback, this, nullptr);
    serviceTable().scheduleWithDispatchQueue(_service, _queue->handle());
    _scheduled = true;
}

void PluginHost::unschedule() {
    serviceTable().unscheduleFromDispatchQueue(_service, _queue->handle());
    _queue->barrier();  // events already submitted reach the old sink
    _scheduled = false;
}

void PluginHost::close(uint32_t options) {
    serviceTable().close(_service, options);
    _open = false;
}

ZeltoReturn PluginHost::stop() {
    _started = false;
    return pluginTable().Stop(_plugin);
}

PropertyValue PluginHost::copyProperty(const PropertyValue& key) {
    std::unique_ptr<PropertyValue> value(serviceTable().copyProperty(_service, &key));
    return value ? *value : PropertyValue();
}

bool PluginHost::setProperty(const PropertyValue& key, const PropertyValue& value) {
    return serviceTable().setProperty(_service, &key, &value);
}

void PluginHost::eventCallback(void* target, void*, void*, HIDEvent* event, uint32_t) {
    auto* host = static_cast<PluginHost*>(target);
    if (event != nullptr && host->_sink) host->_sink(*event);
}

}  // namespace ZeltoTouch::Platform
