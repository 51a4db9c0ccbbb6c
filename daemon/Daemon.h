#pragma once
// Daemon: tolkatouchd's whole run. It finds the surface's hidraw nodes (or, with a recording
// document, a simulated surface), runs one plug-in instance per device, turns each instance's
// gesture events into media keys (and, when asked, JSON lines on standard output), and answers
// the control socket. Everything but the plug-in's own threads and the event queue runs on the
// main thread's run loop: udev news, the control socket, key repeats, signals, and the events,
// which the dispatch queue hands over as run loop blocks.

#include <atomic>
#include <cstdint>
#include <cstdio>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "daemon/ControlRequests.h"
#include "daemon/LogSettings.h"
#include "daemon/SurfaceIds.h"
#include "platform/DispatchQueue.h"
#include "platform/HIDDevice.h"
#include "platform/HIDEvent.h"
#include "platform/Log.h"

namespace TolkaTouch {

class ControlServer;
class CountingHIDDevice;
class DeviceDiscovery;
class KeyMapper;
class KeyOutput;
class LiveFrames;
class PluginInstance;
class PluginLibrary;
class RunLoop;
class SimulatedHIDDevice;
class SimulationFeeder;
class WatchHub;
struct HidrawNode;

struct DaemonOptions {
    uint16_t vendor = SurfaceIds::kDefaultVendorId;
    uint16_t product = SurfaceIds::kDefaultProductId;
    std::string pluginPath;
    std::string socketPath;
    std::string uinputPath = "/dev/uinput";
    bool print = false;       // each event as a JSON line on the print output
    bool noKeys = false;      // no virtual keyboard
    std::string keyLogPath;   // key writes to this file instead of the virtual keyboard
    std::string simulatePath; // a recording document to play as the device; empty: real devices
    float speed = 1.0f;       // pacing of the simulation
    LogSettings log;          // read again on SIGHUP
};

class Daemon final : public ControlTarget {
public:
    // Sets up the key output, the plug-in, the control socket and discovery or simulation.
    // Throws std::runtime_error with the one line to show when the daemon cannot start.
    // SIGTERM and SIGINT must already be blocked in every thread (the daemon takes them from a
    // signalfd).
    Daemon(DaemonOptions options, std::FILE* printOutput);
    ~Daemon() override;
    Daemon(const Daemon&) = delete;
    Daemon& operator=(const Daemon&) = delete;

    // Serves until SIGTERM or SIGINT, or until the simulated device's document has been played.
    // Answers the process's exit status: 1 when the simulated document stopped reading part way.
    int run();

    // ControlTarget: called on the control socket's workers, while the run loop goes on.
    std::vector<ControlDeviceInfo> devices() override;
    std::optional<PropertyValue> getProperty(std::optional<uint32_t> service, const std::string& key) override;
    bool startWatching() override;
    bool startLive() override;
    std::optional<bool> setProperty(std::optional<uint32_t> service, const std::string& key,
                                    const PropertyValue& value) override;

private:
    struct Device;

    static void eventCallback(void* target, void* refcon, void* sender, const HIDEventRef& event, uint32_t options);

    void addSources();
    void startDevices();
    void addHidrawNode(const HidrawNode& node);
    void addDevice(std::string node, uint16_t vendor, uint16_t product, HIDDeviceRef handle);
    void removeDevice(uint32_t service, const char* reason);
    void removeDeviceNode(const std::string& devnode);
    void handleEvent(uint32_t service, const HIDEvent& event);
    void handleSignal();
    void handleRepeatTimer();
    void armRepeatTimer();
    void beginShutdown();
    void stopFeeder();
    std::shared_ptr<PluginInstance> findInstance(std::optional<uint32_t> service);

    DaemonOptions _options;
    std::FILE* _printOutput;
    Log _log{"com.zantor.hid.TolkaTouch", "Daemon"};

    std::unique_ptr<KeyOutput> _keyOutput;  // null when no keys are written
    std::unique_ptr<PluginLibrary> _plugin;
    std::shared_ptr<RunLoop> _loop;
    DispatchQueueRef _eventQueue;
    std::unique_ptr<ControlServer> _control;
    std::unique_ptr<DeviceDiscovery> _discovery;
    std::unique_ptr<SimulationFeeder> _feeder;
    std::shared_ptr<SimulatedHIDDevice> _simulated;
    std::shared_ptr<CountingHIDDevice> _simulatedCounter;
    uint64_t _simulatedWritten = 0;  // reports written by the feeder (its thread only)
    std::atomic<bool> _simulationFailed{false};  // the document did not read to its end
    int _signalFd = -1;
    int _timerFd = -1;
    int _logTimerFd = -1;
    // `tolkatouch watch`: the live lines, and the watched category's level to go back to.
    static constexpr const char* kWatchedCategory = "Algs";
    std::shared_ptr<WatchHub> _watch;
    bool _watching = false;
    int _levelBeforeWatching = 0;
    // Turns the watched debug level and the live lines on or off as subscribers come and go.
    void updateWatching();
    // `tolkatouch view --live`: the newest frame snapshots, taken on the report threads.
    std::shared_ptr<LiveFrames> _live;
    void offerLiveFrame(uint32_t service);

    // Changed only on the run loop, under the lock, which the control socket's workers take to
    // look a device up.
    std::map<uint32_t, std::unique_ptr<Device>> _devices;
    std::mutex _devicesMutex;
    uint32_t _nextService = 1;
    bool _running = true;
    bool _shuttingDown = false;
};

}  // namespace TolkaTouch
