#pragma once
// The USB vendor and product IDs the daemon looks for when no --vendor/--product is given.
// The pair is from the open test range of a shared community vendor ID, free for development
// boards; a production surface passes its own IDs on the command line or in the unit.

#include <cstdint>

namespace TolkaTouch::SurfaceIds {

inline constexpr uint16_t kDefaultVendorId = 0x1209;
inline constexpr uint16_t kDefaultProductId = 0x0001;

}  // namespace TolkaTouch::SurfaceIds
