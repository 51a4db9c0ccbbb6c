// Any bytes as the daemon's log settings: up to the first NUL byte the log configuration file's
// text, after it the TOLKATOUCH_LOG value. Each is applied whole or refused with one line that
// echoes no control character, and a refusal changes no level; then a line logged goes through
// the levels and the rate guard the text set.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <map>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>

#include "daemon/LogSettings.h"
#include "platform/Log.h"

using namespace TolkaTouch;

namespace {

void expectOneCleanLine(const char* message) {
    for (const char* c = message; *c != '\0'; ++c) {
        if (static_cast<unsigned char>(*c) < 0x20 || *c == 0x7f) std::abort();
    }
}

void expectKnownLevels() {
    for (const auto& [category, name] : SystemLog::minimumLevels()) {
        if (!SystemLog::levelFromName(name)) std::abort();
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const bool quiet = [] {
        SystemLog::setSink(std::make_shared<SystemLog::MemorySink>(), true);
        return true;
    }();
    (void)quiet;
    const std::string_view input(reinterpret_cast<const char*>(data), size);
    const size_t nul = input.find('\0');
    const std::string file(input.substr(0, nul));
    const std::string environment(nul == std::string_view::npos ? std::string_view() : input.substr(nul + 1));

    const auto before = SystemLog::minimumLevels();
    try {
        SystemLog::applyConfiguration(file);
    } catch (const std::invalid_argument& refusal) {
        expectOneCleanLine(refusal.what());
        if (SystemLog::minimumLevels() != before) std::abort();
    }
    expectKnownLevels();
    static const Log log("fuzz", "Algs");
    log.log("Received image frame: %u", 1u);
    SystemLog::flushFolded(true);

    // The environment's form, as the daemon takes it: no configuration file, then the variable.
    LogSettings settings;
    settings.configurationPath = "/nonexistent/tolkatouch/log.conf";
    settings.environment = environment;
    const auto beforeEnvironment = SystemLog::minimumLevels();
    try {
        applyLogSettings(settings);
    } catch (const std::runtime_error& refusal) {
        expectOneCleanLine(refusal.what());
        if (SystemLog::minimumLevels() != beforeEnvironment) std::abort();
    }
    expectKnownLevels();
    return 0;
}
