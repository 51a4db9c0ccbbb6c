#include "tools/WatchPrinter.h"

#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "common/Reports.h"
#include "common/Util.h"
#include "platform/Hex.h"

namespace TolkaTouch::Tools {

namespace {
using nlohmann::json;

std::string escaped(const std::string& text, bool keepNewlines) {
    std::string out;
    out.reserve(text.size());
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if ((byte < 0x20 && !(keepNewlines && c == '\n')) || byte == 0x7f) {
            out += fmt::format("\\x{:02x}", byte);
        } else {
            out += c;
        }
    }
    return out;
}

std::string text(const json& object, const char* key) {
    auto it = object.find(key);
    if (it == object.end()) return "?";
    return it->is_string() ? it->get<std::string>() : it->dump();
}

std::string unreadable(const std::string& line) {
    return "unreadable line from tolkatouchd: " + escaped(line.substr(0, 200), false) + "\n";
}

std::string reportText(const json& report) {
    auto bytesField = report.find("bytes");
    if (bytesField == report.end() || !bytesField->is_string()) return "report without bytes\n";
    std::vector<uint8_t> bytes;
    try {
        bytes = Hex::bytesFromPairs(bytesField->get<std::string>());
    } catch (const std::invalid_argument&) {
        return "report whose bytes are not hex\n";
    }
    if (auto image = InputReport::Image::parse(bytes.data(), bytes.size())) {
        return Util::stringFromImage(*image, false) + "\n";
    }
    if (auto event = InputReport::FirmwareEvent::parse(bytes.data(), bytes.size())) {
        return fmt::format("firmware event {}{}, context 0x{:016x}\n", event->event,
                           event->event == InputReport::FirmwareEvent::kReset ? " (reset)" : "",
                           event->contextValue());
    }
    return fmt::format("report of {} bytes: {}\n", bytes.size(), Hex::text(bytes, Hex::Spacing::Between));
}
}  // namespace

std::string watchLineText(const std::string& line) {
    const json object = json::parse(line, nullptr, false);
    if (object.is_discarded() || !object.is_object()) return unreadable(line);
    if (auto log = object.find("log"); log != object.end() && log->is_object()) {
        std::string frame;
        if (auto number = log->find("frame"); number != log->end() && number->is_number_unsigned()) {
            frame = fmt::format(" (frame {})", number->get<uint64_t>());
        }
        return escaped("[" + text(*log, "level") + "] " + text(*log, "category") + frame + ": " + text(*log, "message"),
                       true) +
               "\n";
    }
    if (auto report = object.find("report"); report != object.end() && report->is_object()) return reportText(*report);
    if (auto event = object.find("event"); event != object.end() && event->is_object()) {
        return escaped(fmt::format("event {} region {} (frame {})", text(*event, "event"), text(*event, "region"),
                                   text(*event, "frame")),
                       false) +
               "\n";
    }
    if (auto dropped = object.find("dropped"); dropped != object.end() && dropped->is_number_unsigned()) {
        return fmt::format("({} lines dropped: the service writes faster than this terminal reads)\n",
                           dropped->get<uint64_t>());
    }
    return unreadable(line);
}

}  // namespace TolkaTouch::Tools
