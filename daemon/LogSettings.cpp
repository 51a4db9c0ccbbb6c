#include "daemon/LogSettings.h"

#include <fstream>
#include <sstream>
#include <stdexcept>

#include "platform/Log.h"

#ifndef TOLKA_LOG_CONFIGURATION_PATH
#define TOLKA_LOG_CONFIGURATION_PATH "/etc/tolkatouch/log.conf"
#endif

namespace TolkaTouch {

const char* const kDefaultLogConfigurationPath = TOLKA_LOG_CONFIGURATION_PATH;

namespace {

// "CATEGORY=LEVEL" or "LEVEL" as one configuration line.
std::string configurationLine(const std::string& assignment) {
    const size_t equals = assignment.find('=');
    if (equals == std::string::npos) return "* " + assignment + "\n";
    return assignment.substr(0, equals) + " " + assignment.substr(equals + 1) + "\n";
}

}  // namespace

void applyLogSettings(const LogSettings& settings) {
    std::string text;
    std::ifstream file(settings.configurationPath);
    if (file) {
        std::stringstream contents;
        contents << file.rdbuf();
        text = contents.str();
    } else if (settings.configurationRequired) {
        throw std::runtime_error("cannot read the log configuration " + settings.configurationPath);
    }
    // The file alone first, so that its own mistakes are reported against its own lines.
    try {
        SystemLog::applyConfiguration(text);
    } catch (const std::invalid_argument& error) {
        throw std::runtime_error(settings.configurationPath + ": " + error.what());
    }
    std::string overrides;
    std::stringstream environment(settings.environment);
    for (std::string item; std::getline(environment, item, ',');) {
        if (!item.empty()) overrides += configurationLine(item);
    }
    for (const std::string& item : settings.overrides) overrides += configurationLine(item);
    try {
        SystemLog::applyConfiguration(overrides, true);
    } catch (const std::invalid_argument&) {
        throw std::runtime_error("a log level override does not read (CATEGORY=LEVEL or LEVEL; levels debug, info, "
                                 "default, error, fault, off)");
    }
}

}  // namespace TolkaTouch
