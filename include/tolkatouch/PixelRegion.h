#pragma once
// The zone of the surface a touch is in, and the number of sensing pixels.

#include <cstddef>
#include <cstdint>

namespace TolkaTouch {

// The zone of the surface where a touch is active; carried as a 32-bit unsigned number.
enum class PixelRegion : uint32_t {
    None = 0,
    PlayPause = 1,   // pixels A-F and K
    VolumeDown = 2,  // pixels L-O
    VolumeUp = 3,    // pixels G-J
};

inline constexpr size_t kPixelCount = 15;  // A..O

}  // namespace TolkaTouch
