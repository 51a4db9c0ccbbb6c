// tolkatouch keys [DEVICE]: prints the key events of an input device, by default the daemon's
// virtual keyboard, as JSON lines, so that a script can check what really reached the system.

#include <CLI/CLI.hpp>

#include <dirent.h>
#include <fcntl.h>
#include <libevdev/libevdev.h>
#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "tools/Commands.h"
#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {

namespace {

using Clock = std::chrono::steady_clock;

struct KeysOptions {
    std::string device;
    std::string name = "TolkaTouch media keys";
    double wait = 10;
    double timeout = -1;
    double idle = -1;
    int count = -1;
};

struct EvdevDevice {
    int fd = -1;
    libevdev* device = nullptr;
    std::string path;
    ~EvdevDevice() {
        if (device) libevdev_free(device);
        if (fd >= 0) ::close(fd);
    }
};

std::unique_ptr<EvdevDevice> openDevice(const std::string& path) {
    auto opened = std::make_unique<EvdevDevice>();
    opened->path = path;
    opened->fd = ::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (opened->fd < 0) return nullptr;
    if (libevdev_new_from_fd(opened->fd, &opened->device) != 0) {
        opened->device = nullptr;
        return nullptr;
    }
    return opened;
}

// The first event node whose device has the name, in node order.
std::unique_ptr<EvdevDevice> findByName(const std::string& name) {
    std::vector<std::string> nodes;
    if (DIR* dir = ::opendir("/dev/input")) {
        while (dirent* entry = ::readdir(dir)) {
            if (std::strncmp(entry->d_name, "event", 5) == 0) nodes.push_back(std::string("/dev/input/") + entry->d_name);
        }
        ::closedir(dir);
    }
    std::sort(nodes.begin(), nodes.end(), [](const std::string& a, const std::string& b) {
        return a.size() != b.size() ? a.size() < b.size() : a < b;
    });
    for (const auto& node : nodes) {
        auto opened = openDevice(node);
        if (opened && name == libevdev_get_name(opened->device)) return opened;
    }
    return nullptr;
}

Clock::duration seconds(double value) {
    return std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(value));
}

void runKeys(const KeysOptions& options) {
    std::unique_ptr<EvdevDevice> device;
    const auto giveUp = Clock::now() + seconds(std::max(0.0, options.wait));
    for (;;) {
        device = options.device.empty() ? findByName(options.name) : openDevice(options.device);
        if (device || Clock::now() >= giveUp) break;
        std::this_thread::sleep_for(std::chrono::milliseconds(50));
    }
    if (!device) {
        if (!options.device.empty()) throw ToolError(options.device, std::string("cannot open: ") + std::strerror(errno));
        throw ToolError("keys", "no input device named \"" + options.name + "\"");
    }
    std::fprintf(stderr, "keys: reading %s (%s)\n", device->path.c_str(), libevdev_get_name(device->device));

    const auto start = Clock::now();
    const auto stopAt = options.timeout >= 0 ? start + seconds(options.timeout) : Clock::time_point::max();
    auto lastEvent = start;
    int printed = 0;
    while (options.count < 0 || printed < options.count) {
        auto now = Clock::now();
        auto until = stopAt;
        if (options.idle >= 0) until = std::min(until, lastEvent + seconds(options.idle));
        if (now >= until) break;
        int timeoutMs = until == Clock::time_point::max()
                            ? -1
                            : static_cast<int>(std::chrono::ceil<std::chrono::milliseconds>(until - now).count());
        pollfd pfd{device->fd, POLLIN, 0};
        int ready = ::poll(&pfd, 1, timeoutMs);
        if (ready < 0 && errno == EINTR) continue;
        if (ready < 0) throw ToolError(device->path, std::string("poll failed: ") + std::strerror(errno));
        if (ready == 0) continue;
        if (pfd.revents & (POLLHUP | POLLERR)) throw ToolError(device->path, "the device went away");

        input_event event{};
        int flag = LIBEVDEV_READ_FLAG_NORMAL;
        for (;;) {
            int result = libevdev_next_event(device->device, flag, &event);
            if (result == -EAGAIN) break;
            if (result == LIBEVDEV_READ_STATUS_SYNC) {
                flag = LIBEVDEV_READ_FLAG_SYNC;  // the kernel dropped events; take the resync as it comes
            } else if (result < 0) {
                if (result == -ENODEV) throw ToolError(device->path, "the device went away");
                throw ToolError(device->path, std::string("read failed: ") + std::strerror(-result));
            } else if (flag == LIBEVDEV_READ_FLAG_SYNC && result == LIBEVDEV_READ_STATUS_SUCCESS) {
                flag = LIBEVDEV_READ_FLAG_NORMAL;
            }
            if (event.type != EV_KEY) continue;
            const char* keyName = libevdev_event_code_get_name(EV_KEY, event.code);
            nlohmann::ordered_json line = {
                {"key", keyName ? keyName : std::to_string(event.code)},
                {"value", event.value},
                {"time", double(event.input_event_sec) + double(event.input_event_usec) / 1e6},
            };
            std::printf("%s\n", line.dump().c_str());
            std::fflush(stdout);
            lastEvent = Clock::now();
            if (options.count >= 0 && ++printed >= options.count) break;
        }
    }
}

}  // namespace

void addKeysCommand(CLI::App& app) {
    auto options = std::make_shared<KeysOptions>();
    CLI::App* command = app.add_subcommand(
        "keys",
        "Prints the key events of an input device as JSON lines, {\"key\": \"KEY_VOLUMEUP\", \"value\": 1, "
        "\"time\": seconds}; by default the daemon's virtual keyboard, found by its name.");
    command->add_option("device", options->device, "Event node to read (e.g. /dev/input/event3)");
    command->add_option("--name", options->name, "Read the first input device with this name")->capture_default_str();
    command->add_option("--wait", options->wait, "Seconds to wait for the device to appear")->capture_default_str();
    command->add_option("--timeout", options->timeout, "Stop after this many seconds");
    command->add_option("--idle", options->idle, "Stop after this many seconds without a key event");
    command->add_option("--count", options->count, "Stop after this many key events");
    command->callback([options] { runKeys(*options); });
}

}  // namespace TolkaTouch::Tools
