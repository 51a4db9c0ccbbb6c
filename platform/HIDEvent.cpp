#include "platform/HIDEvent.h"

#include <cstdio>

namespace TolkaTouch {

int64_t HIDEvent::integerValue(uint32_t field) const {
    return field == kDigitizerFrameNumberField ? frameNumberField : 0;
}

void HIDEvent::setIntegerValue(uint32_t field, int64_t value) {
    if (field == kDigitizerFrameNumberField) frameNumberField = value;
}

std::string HIDEvent::description() const {
    char buf[256];
    if (type == HIDEventType::VendorDefined) {
        std::snprintf(buf, sizeof buf,
                      "VendorDefined timestamp=%llu usagePage=0x%X usage=%u version=%u length=%zu options=%u",
                      static_cast<unsigned long long>(timestamp), usagePage, usage, version, payload.size(), options);
    } else {
        std::snprintf(buf, sizeof buf,
                      "Digitizer timestamp=%llu phase=%u mask=0x%X y=%g frame=%lld transducer=%u index=%u "
                      "identity=%u range=%d touch=%d options=%u",
                      static_cast<unsigned long long>(timestamp), phase, eventMask, y,
                      static_cast<long long>(frameNumberField), transducerType, transducerIndex, identity, range,
                      touch, options);
    }
    return buf;
}

HIDEventRef makeDigitizerEvent(uint32_t eventMask, uint32_t phase, double y) {
    auto event = std::make_shared<HIDEvent>();
    event->type = HIDEventType::Digitizer;
    event->eventMask = eventMask;
    event->phase = phase;
    event->y = y;
    return event;
}

HIDEventRef makeVendorDefinedEvent(uint32_t usagePage, uint32_t usage) {
    auto event = std::make_shared<HIDEvent>();
    event->type = HIDEventType::VendorDefined;
    event->transducerType = 0;
    event->usagePage = usagePage;
    event->usage = usage;
    event->version = 0;
    return event;
}

}  // namespace TolkaTouch
