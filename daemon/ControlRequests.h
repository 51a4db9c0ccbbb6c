#pragma once
// The control socket's requests and replies, one JSON object per line:
//   {"get": KEY}                 -> {"value": V}        (V null for a key nobody answers)
//   {"set": KEY, "value": V}     -> {"ok": true|false}  (the service's answer)
//   {"devices": true}            -> {"devices": [{"service": N, "node": PATH, "vendor": V, "product": P}]}
//   {"log": true}                -> {"levels": {"*": LEVEL, CATEGORY: LEVEL, ...}}
//   {"log": CATEGORY, "level": L} -> {"ok": true}  (CATEGORY "*" for every category)
//   {"watch": true}              -> {"ok": true}, then the daemon's live lines (WatchHub.h) until
//                                   the client leaves; the debug level of "Algs" is on meanwhile
//   {"live": true}               -> {"ok": true}, then {"frame": SNAPSHOT} lines (LiveFrames.h), at
//                                   most 60 a second, the newest only for a slow reader
// "get" and "set" may name a device with "device": N (its service number); without it they go to
// the first device. Anything else gets {"error": MESSAGE}.

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/PropertyValue.h"

namespace TolkaTouch {

struct ControlDeviceInfo {
    uint32_t service = 0;
    std::string node;  // the hidraw node, or "simulated:" and the document's path
    uint16_t vendor = 0;
    uint16_t product = 0;
};

// What the requests act on: the daemon's running plug-in instances.
class ControlTarget {
public:
    virtual ~ControlTarget() = default;
    virtual std::vector<ControlDeviceInfo> devices() = 0;
    // Empty when there is no such device (or no device at all, for the first one).
    virtual std::optional<PropertyValue> getProperty(std::optional<uint32_t> service, const std::string& key) = 0;
    virtual std::optional<bool> setProperty(std::optional<uint32_t> service, const std::string& key,
                                            const PropertyValue& value) = 0;
    // Makes the asking client a subscriber of the live lines; false when there are none to give.
    virtual bool startWatching() { return false; }
    // Makes the asking client a subscriber of the live frame snapshots; false when there are none.
    virtual bool startLive() { return false; }
};

// One reply line (without its newline) for one request line.
std::string answerControlRequest(const std::string& line, ControlTarget& target);

// The reply to a request line longer than the control socket takes.
std::string oversizedControlRequestReply();

}  // namespace TolkaTouch
