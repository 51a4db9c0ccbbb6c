#include "daemon/Daemon.h"

#include <sys/signalfd.h>
#include <sys/timerfd.h>
#include <systemd/sd-daemon.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <mutex>
#include <stdexcept>

#include "common/FeatureReports.h"
#include "daemon/ContextHIDDevice.h"
#include "daemon/ControlServer.h"
#include "daemon/CountingHIDDevice.h"
#include "daemon/DeviceDiscovery.h"
#include "daemon/KeyLogOutput.h"
#include "daemon/KeyMapper.h"
#include "daemon/LiveFrames.h"
#include "daemon/PluginInstance.h"
#include "daemon/PluginLibrary.h"
#include "daemon/Signals.h"
#include "daemon/SimulationFeeder.h"
#include "daemon/UinputKeyOutput.h"
#include "daemon/WatchHub.h"
#include "tolkatouch/Gesture.h"
#include "platform/HIDServiceRegistry.h"
#include "platform/HidrawDevice.h"
#include "platform/RunLoop.h"
#include "platform/SimulatedHIDDevice.h"

namespace TolkaTouch {

namespace {
// The main thread's run loop runs only in this mode.
const std::string kLoopMode = "tolkatouchd";

std::chrono::nanoseconds monotonicNow() {
    return std::chrono::steady_clock::now().time_since_epoch();
}

std::string hexId(uint16_t vendor, uint16_t product) {
    char text[16];
    std::snprintf(text, sizeof(text), "%04x:%04x", vendor, product);
    return text;
}

std::runtime_error systemError(const std::string& what) {
    return std::runtime_error(what + ": " + std::strerror(errno));
}
}  // namespace

struct Daemon::Device {
    uint32_t service = 0;
    std::string node;
    uint16_t vendor = 0;
    uint16_t product = 0;
    HIDDeviceRef handle;
    // Shared with a control request being answered on the control socket's worker.
    std::shared_ptr<PluginInstance> instance;
    std::unique_ptr<KeyMapper> keys;  // null when no keys are written
};

Daemon::Daemon(DaemonOptions options, std::FILE* printOutput)
    : _options(std::move(options)), _printOutput(printOutput) {
    if (!_options.keyLogPath.empty()) {
        _keyOutput = std::make_unique<KeyLogOutput>(_options.keyLogPath);
    } else if (!_options.noKeys) {
        try {
            _keyOutput = std::make_unique<UinputKeyOutput>(_options.uinputPath);
        } catch (const std::exception& error) {
            if (!_options.print) throw std::runtime_error(std::string(error.what()) + " (--print shows events without it)");
            _log.log("%s; printing events only", error.what());
        }
    }

    _plugin = std::make_unique<PluginLibrary>(_options.pluginPath);
    if (!_options.simulatePath.empty()) {
        _feeder = std::make_unique<SimulationFeeder>(_options.simulatePath, _options.speed);
    }
    _control = std::make_unique<ControlServer>(
        _options.socketPath, [this](const std::string& line) { return answerControlRequest(line, *this); },
        [] { return oversizedControlRequestReply(); });
    if (_options.simulatePath.empty()) {
        _discovery = std::make_unique<DeviceDiscovery>(_options.vendor, _options.product);
    }

    const sigset_t signals = daemonSignals();
    _signalFd = ::signalfd(-1, &signals, SFD_NONBLOCK | SFD_CLOEXEC);
    if (_signalFd < 0) throw systemError("cannot take signals through a signalfd");
    _timerFd = ::timerfd_create(CLOCK_MONOTONIC, TFD_NONBLOCK | TFD_CLOEXEC);
    if (_timerFd < 0) throw systemError("cannot create the key repeat timer");
    // Once a second the log's rate guard writes the summaries of lines it folded, so that a burst
    // that stops is still counted within a second.
    _logTimerFd = ::timerfd_create(CLOCK_MONOTONIC, TFD_NONBLOCK | TFD_CLOEXEC);
    if (_logTimerFd < 0) throw systemError("cannot create the log timer");
    const itimerspec everySecond{{1, 0}, {1, 0}};
    ::timerfd_settime(_logTimerFd, 0, &everySecond, nullptr);

    _watch = std::make_shared<WatchHub>();
    _live = std::make_shared<LiveFrames>(monotonicNow);
    _loop = RunLoop::current();
    _eventQueue = DispatchQueue::create("tolkatouchd.events");
}

Daemon::~Daemon() {
    _control.reset();  // no request is answered against a daemon being taken apart
    stopFeeder();
    for (auto& [service, device] : _devices) {
        if (device->keys) device->keys->releaseAll();
        device->instance->shutdown();
        HIDServiceRegistry::unregisterService(service);
    }
    {
        std::lock_guard lock(_devicesMutex);
        _devices.clear();
    }
    if (_eventQueue) _eventQueue->sync([] {});
    if (_signalFd >= 0) ::close(_signalFd);
    if (_timerFd >= 0) ::close(_timerFd);
    if (_logTimerFd >= 0) ::close(_logTimerFd);
    // Lines the rate guard folded and has not summarised yet are counted before the daemon goes.
    SystemLog::flushFolded(true);
}

int Daemon::run() {
    addSources();
    startDevices();
    sd_notify(0, "READY=1");
    while (_running) {
        _loop->runInMode(kLoopMode, RunLoop::kInfinite, true);
        armRepeatTimer();
    }
    sd_notify(0, "STOPPING=1");
    return _simulationFailed ? 1 : 0;
}

void Daemon::addSources() {
    _loop->addSource(_signalFd, kLoopMode, [this] { handleSignal(); });
    _loop->addSource(_timerFd, kLoopMode, [this] { handleRepeatTimer(); });
    _loop->addSource(_logTimerFd, kLoopMode, [this] {
        uint64_t expirations;
        [[maybe_unused]] ssize_t got = ::read(_logTimerFd, &expirations, sizeof(expirations));
        SystemLog::flushFolded();
    });
    _loop->addSource(_control->pollFd(), kLoopMode, [this] {
        _control->handleReady();
        updateWatching();
    });
    _loop->addSource(_watch->pollFd(), kLoopMode, [this] {
        _control->push(_watch->take());
        updateWatching();
    });
    _loop->addSource(_live->pollFd(), kLoopMode, [this] {
        if (auto line = _live->take()) _control->pushNewest(*line);
        updateWatching();
    });
    if (_discovery) {
        _loop->addSource(_discovery->pollFd(), kLoopMode, [this] {
            _discovery->handleReady([this](const HidrawNode& node) { addHidrawNode(node); },
                                    [this](const std::string& devnode) { removeDeviceNode(devnode); });
        });
    }
}

void Daemon::startDevices() {
    if (_discovery) {
        auto nodes = _discovery->enumerate();
        if (nodes.empty()) {
            _log.log("waiting for a surface %s", hexId(_options.vendor, _options.product).c_str());
        }
        for (const auto& node : nodes) addHidrawNode(node);
        return;
    }

    PropertyValue::Dictionary properties;
    properties.emplace("VendorID", PropertyValue(static_cast<unsigned>(_options.vendor)));
    properties.emplace("ProductID", PropertyValue(static_cast<unsigned>(_options.product)));
    properties.emplace("Transport", PropertyValue("Virtual"));
    // Reports are queued ahead of their time and handed out by the device's timer: the report
    // thread wakes once per report, as for a real surface's read.
    _simulated = SimulatedHIDDevice::create(std::move(properties), SimulatedHIDDevice::Delivery::AtDueTime);
    if (!_simulated) throw std::runtime_error("cannot create the simulated device");
    // The feature reports a real surface answers, as the virtual surface of `tolkatouch uhid` does.
    for (auto& [id, bytes] : defaultFeatureReports()) _simulated->setFeatureReport(id, std::move(bytes));
    _simulatedCounter = std::make_shared<CountingHIDDevice>(_simulated);
    addDevice("simulated:" + _options.simulatePath, _options.vendor, _options.product, _simulatedCounter);
    if (_devices.empty()) throw std::runtime_error("the plug-in did not take the simulated device");

    // The feeder stops before the instance goes (shutdown), or the instance goes only after the
    // feeder has finished (end of the document), so the feeder may hold on to it.
    PluginInstance* instance = _devices.begin()->second->instance.get();
    SimulationFeeder::Target target;
    target.writeReport = [this](const uint8_t* bytes, size_t length, uint64_t due) {
        if (_simulated->writeInputReport(bytes, length, due)) ++_simulatedWritten;
    };
    target.applySetting = [this, instance](const std::string& key, const PropertyValue& value) {
        // A recorded setting follows the reports before it, as it did when it was recorded.
        _simulatedCounter->waitForDelivered(_simulatedWritten, [this] { return _feeder->stopRequested(); });
        if (_feeder->stopRequested()) return;
        const bool taken = instance->setProperty("Pipeline." + key, value);
        _log.log("setting Pipeline.%s = %s %s", key.c_str(), value.description().c_str(), taken ? "taken" : "refused");
    };
    target.finished = [this] { _simulated->simulateRemoval(); };
    // A frame further on that does not read: the frames before it have been played; the daemon
    // ends as for a document refused at the start, with status 1.
    target.failed = [this](const std::string& message) {
        _log.error("%s", message.c_str());
        _simulationFailed = true;
        _simulated->simulateRemoval();
    };
    _feeder->start(std::move(target));
}

void Daemon::addHidrawNode(const HidrawNode& node) {
    if (_shuttingDown) return;
    for (const auto& [service, device] : _devices) {
        if (device->node == node.devnode) return;  // reported by both the monitor and the enumeration
    }
    uint32_t result = 0;
    auto handle = HidrawDevice::create(node.devnode, &result);
    if (!handle) {
        const char* reason = result == HIDResult::NotPrivileged ? "permission denied"
                             : result == HIDResult::NoDevice    ? "no such device"
                                                                : "not usable";
        _log.error("cannot open %s: %s (0x%08x)", node.devnode.c_str(), reason, result);
        return;
    }
    addDevice(node.devnode, node.vendor, node.product, std::move(handle));
}

void Daemon::addDevice(std::string node, uint16_t vendor, uint16_t product, HIDDeviceRef handle) {
    uint32_t service = _nextService++;
    // The service's start asks the registry for its device: it gets the handle opened here, which
    // names the device and the frame in every log line written while one of its reports is handled.
    HIDDeviceRef logged = std::make_shared<ContextHIDDevice>(handle, node, service, _watch, [this, service] {
        if (_live->due()) offerLiveFrame(service);
    });
    HIDServiceRegistry::registerService(service, [logged] { return logged; });
    // Runs on the service's input report thread, which must not tear itself down: hand over.
    handle->setRemovalHandler([this, service] {
        _loop->performBlock(kLoopMode, [this, service] { removeDevice(service, "the device went away"); });
    });

    PropertyValue::Dictionary matching;
    matching.emplace("VendorID", PropertyValue(static_cast<unsigned>(vendor)));
    matching.emplace("ProductID", PropertyValue(static_cast<unsigned>(product)));
    PluginInstance::EventCallback callback{&Daemon::eventCallback, this,
                                           reinterpret_cast<void*>(static_cast<uintptr_t>(service))};
    auto device = std::make_unique<Device>();
    try {
        device->instance = std::make_shared<PluginInstance>(*_plugin, service, PropertyValue(std::move(matching)),
                                                            callback, _eventQueue);
    } catch (const std::exception& error) {
        HIDServiceRegistry::unregisterService(service);
        _log.error("cannot serve %s: %s", node.c_str(), error.what());
        return;
    }
    device->service = service;
    device->node = std::move(node);
    device->vendor = vendor;
    device->product = product;
    device->handle = std::move(handle);
    if (_keyOutput) device->keys = std::make_unique<KeyMapper>(*_keyOutput, monotonicNow);
    _log.log("serving %s (%s) as service %u", device->node.c_str(), hexId(vendor, product).c_str(), service);
    std::lock_guard lock(_devicesMutex);
    _devices.emplace(service, std::move(device));
}

void Daemon::removeDevice(uint32_t service, const char* reason) {
    std::unique_ptr<Device> removed;
    {
        std::lock_guard lock(_devicesMutex);
        auto it = _devices.find(service);
        if (it == _devices.end()) return;
        removed = std::move(it->second);
        _devices.erase(it);
    }
    Device& device = *removed;
    // A pulled cable must not leave a key down: let go before anything else.
    if (device.keys) device.keys->releaseAll();
    device.instance->shutdown();
    HIDServiceRegistry::unregisterService(service);
    _log.log("stopped serving %s (service %u): %s", device.node.c_str(), service, reason);
    // Events the service queued before it stopped still reach the run loop (to be printed); the
    // device's keys are gone, so none of them can press a key again.
    _eventQueue->sync([] {});
    if (_simulated && _devices.empty()) {
        // A simulated surface does not come back: the daemon's work is done.
        beginShutdown();
    }
}

void Daemon::removeDeviceNode(const std::string& devnode) {
    for (const auto& [service, device] : _devices) {
        if (device->node == devnode) {
            removeDevice(service, "the device was removed");
            return;
        }
    }
}

void Daemon::eventCallback(void* target, void* refcon, void*, const HIDEventRef& event, uint32_t) {
    auto* self = static_cast<Daemon*>(target);
    auto service = static_cast<uint32_t>(reinterpret_cast<uintptr_t>(refcon));
    self->_loop->performBlock(kLoopMode, [self, service, event] { self->handleEvent(service, *event); });
}

void Daemon::handleEvent(uint32_t service, const HIDEvent& event) {
    if (_watch->active()) _watch->event(GestureCodec::jsonLine(event));
    if (_options.print) {
        std::string line = GestureCodec::jsonLine(event);
        line += '\n';
        std::fwrite(line.data(), 1, line.size(), _printOutput);
        std::fflush(_printOutput);
    }
    auto it = _devices.find(service);
    if (it != _devices.end() && it->second->keys) it->second->keys->handleEvent(event);
}

void Daemon::handleSignal() {
    signalfd_siginfo info;
    bool stop = false;
    while (::read(_signalFd, &info, sizeof(info)) == static_cast<ssize_t>(sizeof(info))) {
        const int signal = static_cast<int>(info.ssi_signo);
        const char* name = sigabbrev_np(signal);
        if (signal == SIGHUP) {
            // The log configuration is read again; a broken one leaves the levels as they were.
            try {
                applyLogSettings(_options.log);
                _log.log("SIGHUP: log configuration read again");
            } catch (const std::exception& error) {
                _log.error("SIGHUP: %s", error.what());
            }
            continue;
        }
        _log.log("stopping on SIG%s", name ? name : "?");
        stop = true;
    }
    if (stop) beginShutdown();
}

void Daemon::handleRepeatTimer() {
    uint64_t expirations;
    [[maybe_unused]] ssize_t got = ::read(_timerFd, &expirations, sizeof(expirations));
    for (auto& [service, device] : _devices) {
        if (device->keys) device->keys->repeatDue();
    }
}

void Daemon::armRepeatTimer() {
    std::optional<std::chrono::nanoseconds> next;
    for (const auto& [service, device] : _devices) {
        if (!device->keys) continue;
        auto due = device->keys->nextRepeatTime();
        if (due && (!next || *due < *next)) next = due;
    }
    itimerspec timer{};
    if (next) {
        // Zero would disarm the timer: a time already past is given as one nanosecond.
        auto count = std::max<int64_t>(next->count(), 1);
        timer.it_value.tv_sec = static_cast<time_t>(count / 1'000'000'000);
        timer.it_value.tv_nsec = static_cast<long>(count % 1'000'000'000);
    }
    ::timerfd_settime(_timerFd, TFD_TIMER_ABSTIME, &timer, nullptr);
}

void Daemon::beginShutdown() {
    if (_shuttingDown) return;
    _shuttingDown = true;
    stopFeeder();
    while (!_devices.empty()) removeDevice(_devices.begin()->first, "the daemon is stopping");
    _eventQueue->sync([] {});
    // After the events already handed over (they are blocks queued before this one).
    _loop->performBlock(kLoopMode, [this] { _running = false; });
}

void Daemon::stopFeeder() {
    if (!_feeder) return;
    _feeder->requestStop();
    // A recorded setting may be waiting for reports that will not be handled any more.
    if (_simulatedCounter) _simulatedCounter->wakeWaiters();
    _feeder->stop();
}

std::shared_ptr<PluginInstance> Daemon::findInstance(std::optional<uint32_t> service) {
    std::lock_guard lock(_devicesMutex);
    if (_devices.empty()) return nullptr;
    if (!service) return _devices.begin()->second->instance;
    auto it = _devices.find(*service);
    return it == _devices.end() ? nullptr : it->second->instance;
}

std::vector<ControlDeviceInfo> Daemon::devices() {
    std::lock_guard lock(_devicesMutex);
    std::vector<ControlDeviceInfo> list;
    for (const auto& [service, device] : _devices) {
        list.push_back({service, device->node, device->vendor, device->product});
    }
    return list;
}

// The instance is copied out under the lock and used without it: a whole recording being read
// out holds up no device being added or removed on the run loop.
std::optional<PropertyValue> Daemon::getProperty(std::optional<uint32_t> service, const std::string& key) {
    auto instance = findInstance(service);
    if (!instance) return std::nullopt;
    return instance->copyProperty(key);
}

std::optional<bool> Daemon::setProperty(std::optional<uint32_t> service, const std::string& key,
                                        const PropertyValue& value) {
    auto instance = findInstance(service);
    if (!instance) return std::nullopt;
    const bool taken = instance->setProperty(key, value);
    // Every change of a setting is in the journal, whoever made it.
    _log.log("setting %s = %s %s (service %u)", key.c_str(), value.description().c_str(), taken ? "taken" : "refused",
             instance->service());
    return taken;
}

bool Daemon::startWatching() {
    // Called by a control worker: the log levels change on the run loop, in updateWatching, once
    // the subscription has been taken with the reply.
    _control->subscribe(ControlServer::currentClient());
    return true;
}

bool Daemon::startLive() {
    _control->subscribe(ControlServer::currentClient(), ControlServer::Channel::Frames);
    return true;
}

// On the device's report thread, after a due frame: the plug-in answers the frame's snapshot under
// its own lock, which the report thread has just let go; the hand-over waits for nobody.
void Daemon::offerLiveFrame(uint32_t service) {
    auto instance = findInstance(service);
    if (!instance) return;
    PropertyValue snapshot = instance->tryCopyProperty("Pipeline.Algs.FrameSnapshot");
    if (snapshot.isDictionary()) _live->hand(service, std::move(snapshot));
}

void Daemon::updateWatching() {
    _live->setActive(_control->subscriberCount(ControlServer::Channel::Frames) > 0);
    const bool watched = _control->subscriberCount() > 0;
    if (watched == _watching) return;
    if (!watched) {
        _watch->setActive(false);
        SystemLog::setObserver(nullptr);
        SystemLog::setMinimumLevel(_levelBeforeWatching, kWatchedCategory);
        _watching = false;
        _watch->take();
        _log.log("no longer watched: the %s level is %s again", kWatchedCategory,
                 SystemLog::levelName(_levelBeforeWatching));
        return;
    }
    // The description lines are the recognizer's debug lines: on while anyone watches, then back
    // to the level they had, also when the watcher is killed.
    const auto levels = SystemLog::minimumLevels();
    auto it = levels.find(kWatchedCategory);
    if (it == levels.end()) it = levels.find("*");
    _levelBeforeWatching = SystemLog::levelFromName(it->second).value_or(static_cast<int>(LogLevel::Default));
    SystemLog::setMinimumLevel(static_cast<int>(LogLevel::Debug), kWatchedCategory);
    SystemLog::setObserver(_watch);
    _watch->setActive(true);
    _watching = true;
    _log.log("watched: the %s debug level is on while anyone watches", kWatchedCategory);
}

}  // namespace TolkaTouch
