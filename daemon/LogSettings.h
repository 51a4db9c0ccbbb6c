#pragma once
// The daemon's part of logging as the host: the minimum levels of the log's categories, from the
// log configuration file, then the TOLKATOUCH_LOG environment variable, then --log-level, each
// later one over the earlier. Applied at start and again on SIGHUP.

#include <string>
#include <vector>

namespace TolkaTouch {

// <sysconfdir>/tolkatouch/log.conf of the prefix the build was configured for.
extern const char* const kDefaultLogConfigurationPath;

struct LogSettings {
    std::string configurationPath = kDefaultLogConfigurationPath;
    bool configurationRequired = false;  // named on the command line: a missing file is an error
    std::string environment;             // TOLKATOUCH_LOG: "CATEGORY=LEVEL,..." or "LEVEL"
    std::vector<std::string> overrides;  // --log-level: "CATEGORY=LEVEL" or "LEVEL" (every category)
};

// Applies everything, or nothing: throws std::runtime_error with one line naming what does not
// read (the file and its line, or the override).
void applyLogSettings(const LogSettings& settings);

}  // namespace TolkaTouch
