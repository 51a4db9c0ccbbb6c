#pragma once
// VirtualSurface: a touch surface made by the kernel's user-space HID driver (/dev/uhid). The
// kernel parses the surface's report descriptor and offers the device as any other HID device
// (hidraw node, udev events); this object answers the kernel's feature report requests from a
// table and sends input reports on demand. Destroying it (or the process) unplugs the device.

#include <linux/uhid.h>

#include <chrono>
#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace TolkaTouch {

class VirtualSurface {
public:
    // The IDs the daemon looks for when told none (the VM tier checks that the two agree).
    static constexpr uint16_t kDefaultVendorId = 0x1209;
    static constexpr uint16_t kDefaultProductId = 0x0001;

    struct Options {
        std::string name = "TolkaTouch virtual surface";
        uint16_t vendor = 0;
        uint16_t product = 0;
        // Feature report answers by ID, each the whole report with its ID first.
        std::map<uint8_t, std::vector<uint8_t>> featureReports;
        // Feature report IDs whose requests fail with an I/O error.
        std::set<uint8_t> failingReports;
    };

    // What the kernel has told the device so far.
    struct Status {
        bool started = false;  // a driver is bound
        int openCount = 0;     // readers that hold the device open now
        bool everOpened = false;
        unsigned featureRequests = 0;
    };

    // The answers a fresh surface gives: the hold duration 5000, and for each diagnostic report
    // its declared length of bytes counting up from the report ID.
    static std::map<uint8_t, std::vector<uint8_t>> defaultFeatureReports();

    // A feature answer written "ID=HEX": the report ID (decimal or 0x hex, 1 to 255) and the bytes
    // after it as hex digit pairs, spaces and colons allowed. Returns the whole report, ID first.
    // Throws std::invalid_argument with a one-line message.
    static std::pair<uint8_t, std::vector<uint8_t>> featureFromOption(const std::string& option);

    // The default answers with each "ID=HEX" option laid over them. Throws std::invalid_argument.
    static std::map<uint8_t, std::vector<uint8_t>> featureReportsWith(const std::vector<std::string>& options);

    // A report ID written in decimal or 0x hex, 1 to 255. Throws std::invalid_argument.
    static uint8_t reportIDFromText(const std::string& text);

    // Creates the device. Throws std::runtime_error with a one-line message when the uhid node
    // cannot be opened or refuses the device.
    explicit VirtualSurface(Options options, const std::string& uhidPath = "/dev/uhid");
    ~VirtualSurface();  // destroys the device
    VirtualSurface(const VirtualSurface&) = delete;
    VirtualSurface& operator=(const VirtualSurface&) = delete;

    // Answers every request the kernel has queued, waiting for requests until the deadline.
    void serviceUntil(std::chrono::steady_clock::time_point deadline);

    // Hands one input report (ID first) to the kernel. Throws std::runtime_error on failure.
    void sendInputReport(const std::vector<uint8_t>& report);

    // Unplugs the device now; later calls do nothing.
    void destroy();

    const Status& status() const { return _status; }
    int fd() const { return _fd; }

    // The request that creates a device with these options: the surface's report descriptor on
    // the USB bus with the options' name and IDs.
    static uhid_event createRequest(const Options& options);

    // What the surface does with one event from the kernel: updates the status and returns the
    // reply to write, if the event wants one (feature report reads and writes).
    static std::optional<uhid_event> answer(const uhid_event& request, const Options& options, Status& status);

private:
    void handleOneRequest();

    Options _options;
    Status _status;
    int _fd = -1;
    bool _created = false;
};

}  // namespace TolkaTouch
