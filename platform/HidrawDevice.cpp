#include "platform/HidrawDevice.h"

#include <fcntl.h>
#include <linux/hidraw.h>
#include <linux/input.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace TolkaTouch {

namespace {

// The request encodes the buffer size in 14 bits.
constexpr size_t kLargestRequestLength = 16383;
constexpr size_t kNameLength = 256;

}  // namespace

std::shared_ptr<HidrawDevice> HidrawDevice::create(const std::string& path, uint32_t* result) {
    const int fd = ::open(path.c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0) {
        if (result) {
            *result = resultForErrno(errno);
        }
        return nullptr;
    }
    hidraw_devinfo info{};
    if (ioctl(fd, HIDIOCGRAWINFO, &info) != 0) {
        if (result) {
            *result = resultForErrno(errno);
        }
        ::close(fd);
        return nullptr;
    }
    if (result) {
        *result = HIDResult::Success;
    }
    return adopt(fd, path);
}

std::shared_ptr<HidrawDevice> HidrawDevice::adopt(int fd, std::string path) {
    std::shared_ptr<HidrawDevice> device(new HidrawDevice(fd, std::move(path)));
    device->readInfo();
    return device;
}

HidrawDevice::HidrawDevice(int fd, std::string path) : _fd(fd), _path(std::move(path)) {}

HidrawDevice::~HidrawDevice() {
    unscheduleAll();
    if (_fd >= 0) {
        ::close(_fd);
    }
}

void HidrawDevice::readInfo() {
    hidraw_devinfo info{};
    if (ioctl(_fd, HIDIOCGRAWINFO, &info) == 0) {
        _info.emplace("VendorID", static_cast<int>(static_cast<uint16_t>(info.vendor)));
        _info.emplace("ProductID", static_cast<int>(static_cast<uint16_t>(info.product)));
        _info.emplace("Transport", transportName(info.bustype));
    }
    char name[kNameLength] = {};
    const int nameLength = ioctl(_fd, HIDIOCGRAWNAME(kNameLength - 1), name);
    if (nameLength > 0) {
        _info.emplace("Product", std::string(name, strnlen(name, static_cast<size_t>(nameLength))));
    }
    int descriptorSize = 0;
    if (ioctl(_fd, HIDIOCGRDESCSIZE, &descriptorSize) == 0 && descriptorSize > 0 &&
        descriptorSize <= HID_MAX_DESCRIPTOR_SIZE) {
        hidraw_report_descriptor descriptor{};
        descriptor.size = static_cast<uint32_t>(descriptorSize);
        if (ioctl(_fd, HIDIOCGRDESC, &descriptor) == 0) {
            PropertyValue::Data bytes(descriptor.value, descriptor.value + descriptor.size);
            _numbered = descriptorUsesReportIDs(bytes.data(), bytes.size());
            _info.emplace("ReportDescriptor", std::move(bytes));
        }
    }
}

PropertyValue HidrawDevice::deviceProperty(std::string_view key) const {
    auto found = _info.find(key);
    return found == _info.end() ? PropertyValue() : found->second;
}

HIDDeviceBase::ReadOutcome HidrawDevice::readInputReport(uint8_t* buffer, size_t capacity) {
    const ssize_t count = ::read(_fd, buffer, capacity);
    if (count > 0) {
        return {ReadStatus::Report, static_cast<size_t>(count)};
    }
    if (count < 0 && (errno == EAGAIN || errno == EINTR)) {
        return {ReadStatus::NothingToRead};
    }
    // End of stream, or the node reports that its device is gone (ENODEV, EIO).
    return {ReadStatus::Gone};
}

uint32_t HidrawDevice::getReport(HIDReportType type, uint32_t reportID, uint8_t* buffer, size_t& length) {
    if (buffer == nullptr || length == 0 || reportID > 0xFF) {
        return HIDResult::BadArgument;
    }
    if (isRemoved()) {
        return HIDResult::NoDevice;
    }
    const size_t requestLength = std::min(length, kLargestRequestLength);
    buffer[0] = static_cast<uint8_t>(reportID);
    int count = -1;
    switch (type) {
        case HIDReportType::Feature:
            count = ioctl(_fd, HIDIOCGFEATURE(requestLength), buffer);
            break;
        case HIDReportType::Input:
            count = ioctl(_fd, HIDIOCGINPUT(requestLength), buffer);
            break;
        case HIDReportType::Output:
            count = ioctl(_fd, HIDIOCGOUTPUT(requestLength), buffer);
            break;
        default:
            return HIDResult::BadArgument;
    }
    if (count < 0) {
        return resultForErrno(errno);
    }
    length = std::min(static_cast<size_t>(count), requestLength);
    return HIDResult::Success;
}

std::string HidrawDevice::transportName(uint32_t busType) {
    switch (busType) {
        case BUS_USB:
            return "USB";
        case BUS_BLUETOOTH:
            return "Bluetooth";
        case BUS_VIRTUAL:
            return "Virtual";
        case BUS_I2C:
            return "I2C";
        case BUS_SPI:
            return "SPI";
        case BUS_PCI:
            return "PCI";
        case BUS_HOST:
            return "Host";
        case BUS_RS232:
            return "Serial";
        default:
            return "Unknown";
    }
}

bool HidrawDevice::descriptorUsesReportIDs(const uint8_t* descriptor, size_t length) {
    constexpr uint8_t kLongItem = 0xFE;
    constexpr uint8_t kReportIDTag = 0x84;  // global item, tag 8
    size_t position = 0;
    while (position < length) {
        const uint8_t prefix = descriptor[position];
        if (prefix == kLongItem) {
            if (position + 1 >= length) {
                break;
            }
            position += 3 + descriptor[position + 1];
            continue;
        }
        if ((prefix & 0xFC) == kReportIDTag) {
            return true;
        }
        const size_t dataSize = (prefix & 0x03) == 3 ? 4 : (prefix & 0x03);
        position += 1 + dataSize;
    }
    return false;
}

uint32_t HidrawDevice::resultForErrno(int error) {
    switch (error) {
        case 0:
            return HIDResult::Success;
        case ENOENT:
        case ENODEV:
        case ENXIO:
            return HIDResult::NoDevice;
        case EACCES:
        case EPERM:
            return HIDResult::NotPrivileged;
        case ENOTTY:
        case EINVAL:
        case EPIPE:
        case EOPNOTSUPP:
            return HIDResult::Unsupported;
        case ENOMEM:
            return HIDResult::NoMemory;
        case ETIMEDOUT:
            return HIDResult::Timeout;
        case EIO:
            return HIDResult::IOError;
        default:
            return HIDResult::Error;
    }
}

}  // namespace TolkaTouch
