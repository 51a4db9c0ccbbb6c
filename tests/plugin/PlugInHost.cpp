#include "tests/plugin/PlugInHost.h"

#include <dlfcn.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <atomic>
#include <cstdio>
#include <cstdlib>

#include "platform/HIDServiceRegistry.h"

namespace TolkaTouch::Testing {

Host::PlugInFactoryFunction plugInFactory() {
    static Host::PlugInFactoryFunction factory = [] {
        void* library = dlopen(TOLKA_PLUGIN_PATH, RTLD_NOW | RTLD_LOCAL);
        if (!library) {
            std::fprintf(stderr, "cannot load %s: %s\n", TOLKA_PLUGIN_PATH, dlerror());
            std::abort();
        }
        auto found = reinterpret_cast<Host::PlugInFactoryFunction>(dlsym(library, Host::kFactorySymbol));
        if (!found) {
            std::fprintf(stderr, "no %s in %s\n", Host::kFactorySymbol, TOLKA_PLUGIN_PATH);
            std::abort();
        }
        return found;
    }();
    return factory;
}

uint32_t uniqueServiceHandle() {
    static std::atomic<uint32_t> next{0x1000};
    return next++;
}

void EventCollector::callback(void* target, void* refcon, void* sender, const HIDEventRef& event, uint32_t options) {
    auto* collector = static_cast<EventCollector*>(target);
    bool onQueue = collector->_queue && collector->_queue->isCurrent();
    // Notified under the lock: a test that has seen its count may destroy the collector at once,
    // and must not find this thread still inside the condition variable.
    std::lock_guard lock(collector->_mutex);
    collector->_events.push_back(ReceivedEvent{target, refcon, sender, event, options, std::this_thread::get_id(), onQueue});
    collector->_changed.notify_all();
}

std::vector<ReceivedEvent> EventCollector::events() const {
    std::lock_guard lock(_mutex);
    return _events;
}

size_t EventCollector::count() const {
    std::lock_guard lock(_mutex);
    return _events.size();
}

bool EventCollector::waitForCount(size_t count, double seconds) const {
    std::unique_lock lock(_mutex);
    return _changed.wait_for(lock, std::chrono::duration<double>(seconds), [&] { return _events.size() >= count; });
}

void ThreadTaggedLogSink::write(const LogRecord& record) {
    std::lock_guard lock(_mutex);
    _lines.push_back(Line{record, std::this_thread::get_id()});
}

std::vector<ThreadTaggedLogSink::Line> ThreadTaggedLogSink::lines() const {
    std::lock_guard lock(_mutex);
    return _lines;
}

std::vector<std::string> ThreadTaggedLogSink::messages(const std::string& category) const {
    std::lock_guard lock(_mutex);
    std::vector<std::string> messages;
    for (const Line& line : _lines) {
        if (line.record.category == category) messages.push_back(line.record.message);
    }
    return messages;
}

void ThreadTaggedLogSink::clear() {
    std::lock_guard lock(_mutex);
    _lines.clear();
}

SinkInstallation::SinkInstallation() {
    SystemLog::setSink(log);
    SystemLog::setDebugEnabled(true);
    Trace::setSink(trace);
}

SinkInstallation::~SinkInstallation() {
    Trace::setSink(nullptr);
    SystemLog::setSink(nullptr);
}

std::vector<Trace::Record> SinkInstallation::traces(uint32_t code) const {
    std::vector<Trace::Record> found;
    for (const Trace::Record& record : trace->records()) {
        if (record.code == code) found.push_back(record);
    }
    return found;
}

PlugInHost::PlugInHost() : serviceHandle(uniqueServiceHandle()), device(SimulatedHIDDevice::create()) {
    std::shared_ptr<SimulatedHIDDevice> served = device;
    HIDServiceRegistry::registerService(serviceHandle, [served] { return served; });
    plugin = static_cast<Host::PlugInInterface**>(plugInFactory()(nullptr, Host::kHIDServicePlugInTypeID));
    if (plugin) {
        (*plugin)->QueryInterface(plugin, Host::kHIDServiceInterfaceID, reinterpret_cast<void**>(&service));
    }
}

PlugInHost::~PlugInHost() {
    release();
    queue->sync([] {});  // deliveries still queued reach the collector before it goes
    HIDServiceRegistry::unregisterService(serviceHandle);
}

Host::Result PlugInHost::start() {
    return (*plugin)->Start(plugin, nullptr, serviceHandle);
}

bool PlugInHost::open(uint32_t options) {
    return (*service)->open(service, options);
}

void PlugInHost::close(uint32_t options) {
    (*service)->close(service, options);
}

Host::Result PlugInHost::stop() {
    return (*plugin)->Stop(plugin);
}

void PlugInHost::setEventCallback() {
    (*service)->setEventCallback(service, EventCollector::callback, &collector, this);
}

void PlugInHost::schedule() {
    (*service)->scheduleWithDispatchQueue(service, &queue);
}

void PlugInHost::unschedule() {
    (*service)->unscheduleFromDispatchQueue(service, &queue);
}

void PlugInHost::run() {
    start();
    open();
    setEventCallback();
    schedule();
}

void PlugInHost::halt() {
    unschedule();
    close();
    stop();
}

PropertyValue PlugInHost::copyProperty(const char* key) {
    return (*service)->copyProperty(service, key);
}

bool PlugInHost::setProperty(const char* key, const PropertyValue& value) {
    return (*service)->setProperty(service, key, &value);
}

void PlugInHost::write(const std::vector<uint8_t>& report) {
    device->writeInputReport(report);
}

void PlugInHost::release() {
    if (_released) return;
    _released = true;
    if (service) (*service)->Release(service);
    if (plugin) (*plugin)->Release(plugin);
}

CallLogDevice::CallLogDevice() : _neverReadable(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {}

CallLogDevice::~CallLogDevice() {
    if (_neverReadable >= 0) ::close(_neverReadable);
}

void CallLogDevice::note(std::string call) const {
    std::lock_guard lock(_mutex);
    _calls.push_back(std::move(call));
}

uint32_t CallLogDevice::open(uint32_t options) {
    note("open " + std::to_string(options));
    return HIDResult::Success;
}

uint32_t CallLogDevice::close(uint32_t options) {
    note("close " + std::to_string(options));
    return HIDResult::Success;
}

PropertyValue CallLogDevice::getProperty(std::string_view key) const {
    note("getProperty " + std::string(key));
    return {};
}

bool CallLogDevice::setProperty(std::string_view key, PropertyValue value) {
    note("setProperty " + std::string(key) + " " + value.description());
    return true;
}

uint32_t CallLogDevice::getReport(HIDReportType type, uint32_t reportID, uint8_t*, size_t& length) {
    char call[64];
    std::snprintf(call, sizeof call, "getReport %s 0x%02x %zu", type == HIDReportType::Feature ? "Feature" : "Other",
                  reportID, length);
    note(call);
    return HIDResult::Unsupported;
}

void CallLogDevice::registerInputReportCallback(uint8_t* buffer, size_t length, InputReportCallback callback,
                                                void* context) {
    {
        std::lock_guard lock(_mutex);
        _buffers.push_back(buffer);
    }
    note("register " + std::to_string(length) + (callback ? " callback" : " null") + (context ? " context" : " null"));
}

void CallLogDevice::scheduleWithRunLoop(RunLoop& runLoop, const std::string& mode) {
    note("schedule " + mode + (runLoop.isCurrent() ? "" : " (from another thread)"));
    _source = runLoop.addSource(_neverReadable, mode, [] {});
}

void CallLogDevice::unscheduleFromRunLoop(RunLoop& runLoop, const std::string& mode) {
    note("unschedule " + mode + (runLoop.isCurrent() ? "" : " (from another thread)"));
    runLoop.removeSource(_source);
    _source = 0;
}

void CallLogDevice::setRemovalHandler(std::function<void()>) {}

std::vector<std::string> CallLogDevice::calls() const {
    std::lock_guard lock(_mutex);
    return _calls;
}

bool CallLogDevice::oneBufferThroughout() const {
    std::lock_guard lock(_mutex);
    for (const uint8_t* buffer : _buffers) {
        if (buffer != _buffers.front()) return false;
    }
    return true;
}

ServedDevice::ServedDevice(std::shared_ptr<HIDDevice> device) : serviceHandle(uniqueServiceHandle()) {
    HIDServiceRegistry::registerService(serviceHandle, [device] { return device; });
}

ServedDevice::~ServedDevice() {
    HIDServiceRegistry::unregisterService(serviceHandle);
}

namespace {
void appendU32(std::vector<uint8_t>& bytes, uint32_t value) {
    for (int shift = 0; shift < 32; shift += 8) bytes.push_back(static_cast<uint8_t>(value >> shift));
}
void appendU16(std::vector<uint8_t>& bytes, uint16_t value) {
    bytes.push_back(static_cast<uint8_t>(value));
    bytes.push_back(static_cast<uint8_t>(value >> 8));
}
}  // namespace

std::vector<uint8_t> imageReport(uint32_t frameNumber, uint32_t timeMs, int16_t reading) {
    std::vector<uint8_t> bytes{1};
    appendU32(bytes, frameNumber);
    appendU32(bytes, timeMs);
    bytes.insert(bytes.end(), 4, 0);  // aux bytes
    for (int i = 0; i < 15; ++i) appendU16(bytes, static_cast<uint16_t>(reading));  // raw readings
    for (int i = 0; i < 15; ++i) appendU16(bytes, static_cast<uint16_t>(reading));  // signed readings
    return bytes;
}

std::vector<uint8_t> firmwareEventReport(uint8_t event, const std::vector<uint8_t>& context) {
    std::vector<uint8_t> bytes{2, event};
    for (size_t i = 0; i < 8; ++i) bytes.push_back(i < context.size() ? context[i] : 0);
    return bytes;
}

}  // namespace TolkaTouch::Testing
