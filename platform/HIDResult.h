#pragma once
// The 32-bit result codes that the host's interfaces answer: the device handle's operations and
// the plug-in's interface tables use this one set.

#include <cstdint>

namespace TolkaTouch {

namespace HIDResult {
inline constexpr uint32_t Success = 0;
inline constexpr uint32_t NoInterface = 0x80000004;  // an interface the object does not have
inline constexpr uint32_t Error = 0xE00002BC;         // general failure
inline constexpr uint32_t NoMemory = 0xE00002BD;
inline constexpr uint32_t NotCreated = 0xE00002BE;    // device handle not created
inline constexpr uint32_t NoDevice = 0xE00002C0;      // no such device, or it went away
inline constexpr uint32_t NotPrivileged = 0xE00002C1;
inline constexpr uint32_t BadArgument = 0xE00002C2;
inline constexpr uint32_t Unsupported = 0xE00002C7;   // operation or report not supported
inline constexpr uint32_t IOError = 0xE00002CA;
inline constexpr uint32_t NotOpen = 0xE00002CD;
inline constexpr uint32_t Timeout = 0xE00002D6;
}  // namespace HIDResult

}  // namespace TolkaTouch
