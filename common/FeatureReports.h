#pragma once
// The feature reports a surface answers when nothing else is said: the factory-reset hold
// duration and each of the firmware's diagnostic blocks, every report with its ID first. The
// virtual surface (tolkatouch uhid) and the daemon's simulated device (--simulate) answer these,
// so every property reads as on a real surface.

#include <cstdint>
#include <map>
#include <vector>

namespace TolkaTouch {

inline constexpr uint32_t kDefaultFactoryResetHoldDuration = 5000;

std::map<uint8_t, std::vector<uint8_t>> defaultFeatureReports();

}  // namespace TolkaTouch
