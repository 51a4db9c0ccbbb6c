#pragma once
// HidrawDevice: a device handle on a kernel hidraw node (/dev/hidrawN). Each read of the node is
// one input report; feature reports come through the node's get-feature request; VendorID,
// ProductID, Product, Transport and ReportDescriptor come from the node's info requests.

#include <string>

#include "platform/HIDDeviceBase.h"

namespace TolkaTouch {

class HidrawDevice : public HIDDeviceBase {
public:
    // Opens the node at `path`. On failure answers null and sets `*result` (when given):
    // NoDevice (no such node), NotPrivileged (no access), Unsupported (not a hidraw node), Error.
    static std::shared_ptr<HidrawDevice> create(const std::string& path, uint32_t* result = nullptr);

    // Takes over an open file descriptor (closed with the device) that need not be a hidraw node,
    // e.g. the read end of a pipe: requests the descriptor does not understand answer Unsupported,
    // and reports are taken as numbered unless the node's report descriptor says otherwise.
    static std::shared_ptr<HidrawDevice> adopt(int fd, std::string path);

    ~HidrawDevice() override;

    const std::string& path() const { return _path; }

    uint32_t getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, size_t& length) override;

    // The "Transport" text of a kernel bus type: "USB", "Bluetooth", "Virtual", "I2C", "SPI", ...,
    // "Unknown" for the rest.
    static std::string transportName(uint32_t busType);
    // Whether a report descriptor declares report IDs (a Report ID item anywhere).
    static bool descriptorUsesReportIDs(const uint8_t* descriptor, size_t length);
    // The result code for an errno of a hidraw request or read.
    static uint32_t resultForErrno(int error);

protected:
    ReadOutcome readInputReport(uint8_t* buffer, size_t capacity) override;
    int inputFileDescriptor() const override { return _fd; }
    PropertyValue deviceProperty(std::string_view key) const override;
    bool reportsAreNumbered() const override { return _numbered; }

private:
    HidrawDevice(int fd, std::string path);
    void readInfo();

    const int _fd;
    const std::string _path;
    bool _numbered = true;
    PropertyValue::Dictionary _info;  // filled once before the handle is shared
};

}  // namespace TolkaTouch
