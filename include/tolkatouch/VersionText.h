#pragma once
// What `--version` prints for a program: "tolkatouch 0.1.0 (a1b2c3d)".

#include <string>

#include "tolkatouch/Version.h"

namespace TolkaTouch {

inline std::string versionText(const std::string& program) {
    std::string text = program + " " + kVersion;
    if (*kRevision != '\0') text += std::string(" (") + kRevision + ")";
    return text;
}

}  // namespace TolkaTouch
