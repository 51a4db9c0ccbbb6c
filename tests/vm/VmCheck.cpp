// tolka-vm-check: the checks the VM tier runs inside the virtual machine, on what the kernel and
// the daemon really did.
//
//   tolka-vm-check hidraw NODE --document DOC [--feature ID=HEX]... [--fail-report ID]... [--inputs N]
//       the node's IDs and descriptor, the kernel's own parse of the descriptor (debugfs), every
//       feature report as the virtual surface answers it, and the first N input reports of DOC
//   tolka-vm-check keys --document DOC --keys FILE [--set KEY=JSON]... [--destroy-after SECONDS]
//       the key events read from the daemon's keyboard (tolkatouch keys) against what the
//       document's events map to, with the settings applied first (and the surface unplugged
//       that far into the document); a hold's repeat count may be --fewer-repeats (2) below or
//       --more-repeats (1) above the ideal clock's
//   tolka-vm-check props --firmware-debug-reports FILE --hold-duration FILE [--feature ID=HEX]...
//                        [--fail-report ID]...
//       what `tolkatouch prop get` showed against what the virtual surface answered
//
// Prints one line per finding; exits 0 when everything matched, 1 otherwise.

#include <CLI/CLI.hpp>

#include <fcntl.h>
#include <linux/hidraw.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <dirent.h>
#include <fstream>
#include <charconv>
#include <map>
#include <optional>
#include <memory>
#include <nlohmann/json.hpp>
#include <set>
#include <sstream>
#include <string>
#include <string_view>
#include <vector>

#include <libevdev/libevdev.h>

#include "daemon/KeyMapper.h"
#include "daemon/SurfaceIds.h"
#include "pipeline/Pipeline.h"
#include "pipeline/PipelineRecording.h"
#include "platform/PropertyValueJson.h"
#include "common/ReportDescriptor.h"
#include "tools/VirtualSurface.h"

namespace TolkaTouch {
namespace {

static_assert(VirtualSurface::kDefaultVendorId == SurfaceIds::kDefaultVendorId,
              "the virtual surface must carry the IDs the daemon looks for by default");
static_assert(VirtualSurface::kDefaultProductId == SurfaceIds::kDefaultProductId,
              "the virtual surface must carry the IDs the daemon looks for by default");

int failures = 0;

void fail(const std::string& what) {
    std::printf("FAIL: %s\n", what.c_str());
    ++failures;
}

void ok(const std::string& what) { std::printf("ok: %s\n", what.c_str()); }

std::string hex(const uint8_t* bytes, size_t length) {
    std::string text;
    char pair[4];
    for (size_t i = 0; i < length; ++i) {
        std::snprintf(pair, sizeof pair, i + 1 < length ? "%02x " : "%02x", bytes[i]);
        text += pair;
    }
    return text;
}

PipelineRecording loadDocument(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) throw std::runtime_error("cannot read " + path);
    std::vector<uint8_t> data((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    return PipelineRecording(&data);
}

// ---- hidraw ----

// The number in "<prefix><digits>)" at the start of text (leading blanks skipped), if it is there.
std::optional<uint32_t> numberAfter(std::string_view text, std::string_view prefix) {
    text.remove_prefix(std::min(text.find_first_not_of(" \t"), text.size()));
    if (!text.starts_with(prefix)) return std::nullopt;
    text.remove_prefix(prefix.size());
    uint32_t number = 0;
    auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc() || end == text.data() + text.size() || *end != ')') return std::nullopt;
    return number;
}

// Report lengths (bytes after the ID) as the kernel's parser laid them out, from its debugfs dump:
// a report starts at a line "INPUT(1)[...", "OUTPUT(..." or "FEATURE(...", and each of its fields
// adds "Report Size(bits)" times "Report Count(n)".
std::map<std::pair<std::string, int>, uint32_t> kernelReportLengths(const std::string& dumpPath) {
    std::ifstream in(dumpPath);
    std::map<std::pair<std::string, int>, uint32_t> bits;
    if (!in) return bits;
    std::pair<std::string, int> current{"", -1};
    uint32_t fieldSize = 0;
    std::string line;
    while (std::getline(in, line)) {
        bool header = false;
        for (const char* kind : {"INPUT", "OUTPUT", "FEATURE"}) {
            const auto id = numberAfter(line, std::string(kind) + "(");
            if (id && line.find(std::string(kind) + "(" + std::to_string(*id) + ")[") != std::string::npos) {
                current = {kind, static_cast<int>(*id)};
                bits[current] += 0;
                header = true;
                break;
            }
        }
        if (header || current.second < 0) continue;
        if (const auto size = numberAfter(line, "Report Size(")) {
            fieldSize = *size;
        } else if (const auto count = numberAfter(line, "Report Count(")) {
            bits[current] += fieldSize * *count;
        }
    }
    for (auto& [key, value] : bits) value /= 8;
    return bits;
}

std::string debugfsDumpFor(const std::string& node) {
    // /sys/class/hidraw/hidrawN/device is the HID device; its name is the debugfs directory's.
    std::string name = node.substr(node.rfind('/') + 1);
    char target[512] = {};
    std::string link = "/sys/class/hidraw/" + name + "/device";
    ssize_t length = ::readlink(link.c_str(), target, sizeof target - 1);
    if (length <= 0) return "";
    std::string device(target, size_t(length));
    return "/sys/kernel/debug/hid/" + device.substr(device.rfind('/') + 1) + "/rdesc";
}

void checkHidraw(const std::string& node, const std::string& documentPath, const std::vector<std::string>& features,
                 const std::vector<std::string>& failing, int inputs) {
    int fd = ::open(node.c_str(), O_RDWR | O_CLOEXEC);
    if (fd < 0) return fail("cannot open " + node + ": " + std::strerror(errno));

    hidraw_devinfo info{};
    if (::ioctl(fd, HIDIOCGRAWINFO, &info) < 0) {
        fail(std::string("HIDIOCGRAWINFO: ") + std::strerror(errno));
    } else {
        char ids[64];
        std::snprintf(ids, sizeof ids, "bus %u vendor %04x product %04x", info.bustype, uint16_t(info.vendor),
                      uint16_t(info.product));
        if (uint16_t(info.vendor) == SurfaceIds::kDefaultVendorId &&
            uint16_t(info.product) == SurfaceIds::kDefaultProductId && info.bustype == 3) {
            ok(std::string("HIDIOCGRAWINFO ") + ids);
        } else {
            fail(std::string("HIDIOCGRAWINFO ") + ids);
        }
    }

    int descriptorSize = 0;
    hidraw_report_descriptor descriptor{};
    if (::ioctl(fd, HIDIOCGRDESCSIZE, &descriptorSize) < 0) {
        fail(std::string("HIDIOCGRDESCSIZE: ") + std::strerror(errno));
    } else {
        descriptor.size = descriptorSize;
        if (::ioctl(fd, HIDIOCGRDESC, &descriptor) < 0) {
            fail(std::string("HIDIOCGRDESC: ") + std::strerror(errno));
        } else if (std::vector<uint8_t>(descriptor.value, descriptor.value + descriptor.size) !=
                   std::vector<uint8_t>(ReportDescriptor::kBytes.begin(), ReportDescriptor::kBytes.end())) {
            fail("HIDIOCGRDESC gave " + hex(descriptor.value, descriptor.size));
        } else {
            ok("HIDIOCGRDESC: the project's descriptor, " + std::to_string(descriptor.size) + " bytes");
        }
    }

    const std::string dump = debugfsDumpFor(node);
    auto lengths = kernelReportLengths(dump);
    if (lengths.empty()) {
        fail("no kernel parse of the descriptor at " + dump);
    } else {
        std::map<std::pair<std::string, int>, uint32_t> expected;
        for (const auto& report : ReportDescriptor::kReports) {
            expected[{report.kind == ReportDescriptor::ReportKind::Input ? "INPUT" : "FEATURE", report.id}] =
                report.payloadLength;
        }
        if (lengths == expected) {
            ok("the kernel parsed " + std::to_string(lengths.size()) + " reports of the declared lengths");
        } else {
            for (const auto& [key, length] : lengths) {
                std::printf("  kernel: %s(%d) %u bytes\n", key.first.c_str(), key.second, length);
            }
            fail("the kernel's parse differs from the declared reports");
        }
    }

    auto answers = VirtualSurface::featureReportsWith(features);
    std::vector<uint8_t> failingIDs;
    for (const auto& text : failing) failingIDs.push_back(VirtualSurface::reportIDFromText(text));
    for (const auto& [id, bytes] : answers) {
        uint8_t buffer[128] = {id};
        int got = ::ioctl(fd, HIDIOCGFEATURE(sizeof buffer), buffer);
        char label[32];
        std::snprintf(label, sizeof label, "feature 0x%02x", id);
        bool shouldFail = std::find(failingIDs.begin(), failingIDs.end(), id) != failingIDs.end();
        if (shouldFail) {
            if (got < 0 && errno == EIO) {
                ok(std::string(label) + " fails with EIO");
            } else {
                fail(std::string(label) + " should fail, gave " + (got < 0 ? std::strerror(errno) : hex(buffer, got)));
            }
        } else if (got < 0) {
            fail(std::string(label) + ": " + std::strerror(errno));
        } else if (std::vector<uint8_t>(buffer, buffer + got) != bytes) {
            fail(std::string(label) + " gave " + hex(buffer, got) + ", expected " + hex(bytes.data(), bytes.size()));
        } else {
            ok(std::string(label) + " = " + hex(buffer, got));
        }
    }

    if (inputs > 0) {
        PipelineRecording recording = loadDocument(documentPath);
        std::vector<std::vector<uint8_t>> expected;
        for (const auto& frame : recording.frames()) {
            if (frame.type == PipelineRecording::FrameType::InputReport && int(expected.size()) < inputs) {
                expected.push_back(frame.report);
            }
        }
        int matched = 0;
        for (const auto& report : expected) {
            pollfd pfd{fd, POLLIN, 0};
            if (::poll(&pfd, 1, 10000) <= 0) {
                fail("no input report within 10 s after " + std::to_string(matched));
                break;
            }
            uint8_t buffer[512];
            ssize_t got = ::read(fd, buffer, sizeof buffer);
            if (got < 0) {
                fail(std::string("read: ") + std::strerror(errno));
                break;
            }
            if (std::vector<uint8_t>(buffer, buffer + got) != report) {
                fail("input report " + std::to_string(matched) + " gave " + hex(buffer, size_t(got)) + ", expected " +
                     hex(report.data(), report.size()));
                break;
            }
            ++matched;
        }
        if (matched == int(expected.size())) {
            ok("the first " + std::to_string(matched) + " input reports came through hidraw unchanged");
        }
    }
    ::close(fd);
}

// ---- keys ----

struct KeyEvent {
    double time = 0;
    std::string key;
    int value = 0;
};

// What a key stream means: "tap K" (a press and its release at once), "press K", "repeat K xN"
// (a release and a new press at once while K is held), "release K".
struct Token {
    std::string kind;
    std::string key;
    int repeats = 0;
    bool operator==(const Token&) const = default;
};

std::string describe(const Token& token) {
    return token.kind + " " + token.key + (token.kind == "repeat" ? " x" + std::to_string(token.repeats) : "");
}

constexpr double kAtOnce = 0.05;  // seconds: writes of one step land within this of each other

std::vector<Token> tokenize(const std::vector<KeyEvent>& events) {
    std::vector<Token> tokens;
    for (size_t i = 0; i < events.size(); ++i) {
        const KeyEvent& event = events[i];
        const KeyEvent* next = i + 1 < events.size() ? &events[i + 1] : nullptr;
        bool pairedWithNext = next && next->key == event.key && next->time - event.time < kAtOnce;
        if (event.value == 1 && pairedWithNext && next->value == 0) {
            tokens.push_back({"tap", event.key, 0});
            ++i;
        } else if (event.value == 0 && pairedWithNext && next->value == 1) {
            if (!tokens.empty() && tokens.back().kind == "repeat" && tokens.back().key == event.key) {
                ++tokens.back().repeats;
            } else {
                tokens.push_back({"repeat", event.key, 1});
            }
            ++i;
        } else if (event.value == 1) {
            tokens.push_back({"press", event.key, 0});
        } else if (event.value == 0) {
            tokens.push_back({"release", event.key, 0});
        } else {
            tokens.push_back({"value" + std::to_string(event.value), event.key, 0});
        }
    }
    return tokens;
}

// Every press followed by its repeat count, 0 included, so that a hold that ended just before or
// just after a repeat step compares by count rather than by shape.
std::vector<Token> withRepeatCounts(const std::vector<Token>& tokens) {
    std::vector<Token> result;
    for (size_t i = 0; i < tokens.size(); ++i) {
        result.push_back(tokens[i]);
        if (tokens[i].kind != "press") continue;
        bool repeatFollows = i + 1 < tokens.size() && tokens[i + 1].kind == "repeat" && tokens[i + 1].key == tokens[i].key;
        if (!repeatFollows) result.push_back({"repeat", tokens[i].key, 0});
    }
    return result;
}

class CollectingKeyOutput : public KeyOutput {
public:
    explicit CollectingKeyOutput(const double& now) : _now(now) {}
    void write(const KeyWrite& write) override {
        const char* name = libevdev_event_code_get_name(EV_KEY, write.code);
        events.push_back({_now, name ? name : std::to_string(write.code), write.value});
    }
    std::vector<KeyEvent> events;

private:
    const double& _now;
};

// The daemon's keys for the document under ideal timing: the reports arrive at their recorded
// spacing, and a held key repeats on the daemon's clock.
std::vector<KeyEvent> expectedKeys(const std::string& documentPath, const std::vector<std::string>& settings,
                                   double destroyAfter) {
    PipelineRecording recording = loadDocument(documentPath);
    Pipeline pipeline;
    for (const auto& setting : settings) {
        auto equals = setting.find('=');
        if (equals == std::string::npos) throw std::runtime_error("--set wants KEY=JSON: " + setting);
        const std::string wrapped = "[" + setting.substr(equals + 1) + "]";
        auto value = PropertyValueJson::parse(reinterpret_cast<const uint8_t*>(wrapped.data()), wrapped.size());
        if (!value || !value->array() || value->array()->size() != 1) {
            throw std::runtime_error("--set wants KEY=JSON: " + setting);
        }
        pipeline.setState(setting.substr(0, equals), value->array()->front());
    }
    double now = 0;
    std::chrono::nanoseconds clock{0};
    CollectingKeyOutput output(now);
    KeyMapper mapper(output, [&] { return clock; });
    std::vector<HIDEventRef> pending;
    pipeline.hidEventsProbe = [&](const EventList& events) { pending.insert(pending.end(), events.begin(), events.end()); };

    const auto& frames = recording.frames();
    uint64_t origin = 0;
    bool anyReport = false;
    for (const auto& frame : frames) {
        if (frame.type == PipelineRecording::FrameType::InputReport) {
            origin = frame.timestamp;
            anyReport = true;
            break;
        }
    }
    if (!anyReport) return {};
    const auto unplugAt = destroyAfter >= 0 ? std::chrono::nanoseconds(int64_t(destroyAfter * 1e9))
                                            : std::chrono::nanoseconds::max();
    auto advanceTo = [&](std::chrono::nanoseconds time) {
        while (auto due = mapper.nextRepeatTime()) {
            if (*due > time) break;
            clock = *due;
            now = std::chrono::duration<double>(clock).count();
            mapper.repeatDue();
        }
        clock = time;
        now = std::chrono::duration<double>(clock).count();
    };
    for (const auto& frame : frames) {
        const auto at = std::chrono::nanoseconds(int64_t(frame.timestamp - origin));
        if (frame.timestamp >= origin && at >= unplugAt) {
            advanceTo(unplugAt);
            break;
        }
        advanceTo(frame.timestamp < origin ? std::chrono::nanoseconds(0) : at);
        pipeline.setTime(frame.timestamp);
        if (frame.type == PipelineRecording::FrameType::InputReport) {
            pipeline.handleInputReport(frame.report.data(), frame.report.size());
        } else if (frame.value) {
            pipeline.setState(frame.key, *frame.value);
        }
        for (const auto& event : pending) mapper.handleEvent(*event);
        pending.clear();
    }
    // The virtual surface unplugs after its last report: a key still held is let go.
    mapper.releaseAll();
    return output.events;
}

std::vector<KeyEvent> readKeys(const std::string& path) {
    std::ifstream in(path);
    if (!in) throw std::runtime_error("cannot read " + path);
    std::vector<KeyEvent> events;
    std::string line;
    while (std::getline(in, line)) {
        if (line.empty()) continue;
        auto json = nlohmann::json::parse(line);
        events.push_back({json.at("time").get<double>(), json.at("key").get<std::string>(), json.at("value").get<int>()});
    }
    return events;
}

// Matches the key events read from the keyboard against the expected steps, by their order
// alone: the emulated machine's clock says too little about which writes came together. A
// repeat step may have been taken between lowerSlack fewer and upperSlack more times than the
// ideal clock says (a busy machine runs the daemon's repeat timer late, never early), and at
// least once where the ideal clock repeats twice or more.
class KeyMatcher {
public:
    KeyMatcher(const std::vector<Token>& expected, const std::vector<KeyEvent>& events, int lowerSlack, int upperSlack)
        : _expected(expected), _events(events), _lowerSlack(lowerSlack), _upperSlack(upperSlack),
          _counts(expected.size(), -1) {}

    bool match() { return matchFrom(0, 0); }

    // The repeat count matched for the expected step, or -1.
    int matchedCount(size_t step) const { return _counts[step]; }

private:
    bool is(size_t event, const std::string& key, int value) const {
        return event < _events.size() && _events[event].key == key && _events[event].value == value;
    }

    bool matchFrom(size_t step, size_t event) {
        if (step == _expected.size()) return event == _events.size();
        if (!_failed.insert({step, event}).second) return false;
        const Token& token = _expected[step];
        if (token.kind == "tap") return is(event, token.key, 1) && is(event + 1, token.key, 0) && matchFrom(step + 1, event + 2);
        if (token.kind == "press") return is(event, token.key, 1) && matchFrom(step + 1, event + 1);
        if (token.kind == "release") return is(event, token.key, 0) && matchFrom(step + 1, event + 1);
        if (token.kind != "repeat") return false;
        int available = 0;
        while (is(event + 2 * available, token.key, 0) && is(event + 2 * available + 1, token.key, 1)) ++available;
        const int low = std::max(token.repeats >= 2 ? 1 : 0, token.repeats - _lowerSlack);
        const int high = std::min(available, token.repeats + _upperSlack);
        for (int count = high; count >= low; --count) {
            if (matchFrom(step + 1, event + 2 * size_t(count))) {
                _counts[step] = count;
                return true;
            }
        }
        return false;
    }

    const std::vector<Token>& _expected;
    const std::vector<KeyEvent>& _events;
    int _lowerSlack;
    int _upperSlack;
    std::vector<int> _counts;
    std::set<std::pair<size_t, size_t>> _failed;
};

void checkKeys(const std::string& documentPath, const std::string& keysPath, const std::vector<std::string>& settings,
               int lowerSlack, int upperSlack, double destroyAfter) {
    auto expected = withRepeatCounts(tokenize(expectedKeys(documentPath, settings, destroyAfter)));
    auto events = readKeys(keysPath);
    KeyMatcher matcher(expected, events, lowerSlack, upperSlack);
    if (matcher.match()) {
        bool anyRepeat = false;
        for (size_t i = 0; i < expected.size(); ++i) {
            std::string line = describe(expected[i]);
            if (expected[i].kind == "repeat") {
                line += " (read x" + std::to_string(matcher.matchedCount(i)) + ")";
                anyRepeat = anyRepeat || matcher.matchedCount(i) > 0;
            }
            std::printf("  %s\n", line.c_str());
        }
        ok("the keyboard's " + std::to_string(events.size()) + " key events are what the document's events map to");
        std::printf("  (a held volume key %s)\n", anyRepeat ? "repeated" : "never repeated");
        return;
    }
    // Side by side, the keyboard's events grouped by their time stamps, for whoever reads the log.
    auto actual = withRepeatCounts(tokenize(events));
    size_t rows = std::max(expected.size(), actual.size());
    for (size_t i = 0; i < rows; ++i) {
        std::printf("  %-28s %s\n", i < expected.size() ? describe(expected[i]).c_str() : "-",
                    i < actual.size() ? describe(actual[i]).c_str() : "-");
    }
    fail("the keyboard's key events (right, grouped by time) differ from what the document's events map to (left)");
}

// ---- properties ----

std::string readText(const std::string& path) {
    std::ifstream in(path);
    if (!in) throw std::runtime_error("cannot read " + path);
    std::stringstream text;
    text << in.rdbuf();
    return text.str();
}

void checkProps(const std::string& firmwareFile, const std::string& holdFile, const std::vector<std::string>& features,
                const std::vector<std::string>& failing) {
    auto answers = VirtualSurface::featureReportsWith(features);
    std::vector<uint8_t> failingIDs;
    for (const auto& text : failing) failingIDs.push_back(VirtualSurface::reportIDFromText(text));

    auto reports = nlohmann::json::parse(readText(firmwareFile));
    if (!reports.is_object() || reports.size() != ReportDescriptor::kDiagnosticReports.size()) {
        fail("FirmwareDebugReports is not a dictionary of ten entries: " + reports.dump());
    }
    for (const auto& report : ReportDescriptor::kDiagnosticReports) {
        char key[8];
        std::snprintf(key, sizeof key, "0x%02x", report.id);
        if (!reports.contains(key) || !reports[key].is_string()) {
            fail(std::string("FirmwareDebugReports has no ") + key);
            continue;
        }
        const std::string value = reports[key].get<std::string>();
        if (std::find(failingIDs.begin(), failingIDs.end(), report.id) != failingIDs.end()) {
            char prefix[48];
            std::snprintf(prefix, sizeof prefix, "Failed to get report ID 0x%x: 0x", report.id);
            if (value.rfind(prefix, 0) == 0) {
                ok(std::string(key) + ": \"" + value + "\"");
            } else {
                fail(std::string(key) + " should have failed, shows \"" + value + "\"");
            }
            continue;
        }
        const auto& bytes = answers[report.id];
        std::string expected;
        char pair[4];
        for (uint8_t byte : bytes) {
            std::snprintf(pair, sizeof pair, "%02x ", byte);
            expected += pair;
        }
        if (value == expected) {
            ok(std::string(key) + ": \"" + value + "\"");
        } else {
            fail(std::string(key) + " shows \"" + value + "\", the surface answered \"" + expected + "\"");
        }
    }

    const auto& hold = answers[ReportDescriptor::kFactoryResetHoldDurationReport.id];
    const uint32_t expectedHold = uint32_t(hold.at(1)) | uint32_t(hold.at(2)) << 8 | uint32_t(hold.at(3)) << 16 |
                                  uint32_t(hold.at(4)) << 24;
    std::string holdText = readText(holdFile);
    while (!holdText.empty() && std::isspace(static_cast<unsigned char>(holdText.back()))) holdText.pop_back();
    if (holdText == std::to_string(expectedHold)) {
        ok("FactoryResetHoldDuration: " + holdText);
    } else {
        fail("FactoryResetHoldDuration shows \"" + holdText + "\", the surface answered " + std::to_string(expectedHold));
    }
}

}  // namespace
}  // namespace TolkaTouch

int main(int argc, char** argv) {
    using namespace TolkaTouch;
    CLI::App app{"Checks, inside the VM tier, what the kernel and the daemon really did.", "tolka-vm-check"};
    app.require_subcommand(1);

    std::string node, document, keys;
    std::vector<std::string> features, failing, settings;
    int inputs = 0;
    int lowerSlack = 2;
    int upperSlack = 1;
    double destroyAfter = -1;
    std::string firmwareFile, holdFile;

    CLI::App* hidraw = app.add_subcommand("hidraw", "Check a hidraw node of the virtual surface");
    hidraw->add_option("node", node)->required();
    hidraw->add_option("--document", document);
    hidraw->add_option("--feature", features);
    hidraw->add_option("--fail-report", failing);
    hidraw->add_option("--inputs", inputs);
    hidraw->callback([&] { checkHidraw(node, document, features, failing, inputs); });

    CLI::App* keysCommand = app.add_subcommand("keys", "Check the daemon's key events against a document");
    keysCommand->add_option("--document", document)->required();
    keysCommand->add_option("--keys", keys)->required();
    keysCommand->add_option("--set", settings);
    keysCommand->add_option("--fewer-repeats", lowerSlack, "Repeat steps a hold may have fewer than the ideal clock's")
        ->capture_default_str();
    keysCommand->add_option("--more-repeats", upperSlack, "Repeat steps a hold may have more than the ideal clock's")
        ->capture_default_str();
    keysCommand->add_option("--destroy-after", destroyAfter, "The surface was unplugged this many seconds in");
    keysCommand->callback([&] { checkKeys(document, keys, settings, lowerSlack, upperSlack, destroyAfter); });

    CLI::App* props = app.add_subcommand("props", "Check the service's feature report properties");
    props->add_option("--firmware-debug-reports", firmwareFile, "Output of prop get FirmwareDebugReports")->required();
    props->add_option("--hold-duration", holdFile, "Output of prop get FactoryResetHoldDuration")->required();
    props->add_option("--feature", features);
    props->add_option("--fail-report", failing);
    props->callback([&] { checkProps(firmwareFile, holdFile, features, failing); });

    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return app.exit(error);
    } catch (const std::exception& error) {
        std::printf("FAIL: %s\n", error.what());
        return 1;
    }
    return failures == 0 ? 0 : 1;
}
