#pragma once
// Helpers for tests of the recording document: reading text, and catching the exact error kind
// and message a reading raises.

#include <exception>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <typeinfo>
#include <vector>

#include "pipeline/PipelineRecording.h"

namespace TolkaTouch::Testing {

inline std::vector<uint8_t> bytesOf(std::string_view text) { return std::vector<uint8_t>(text.begin(), text.end()); }
inline std::string textOf(const std::vector<uint8_t>& bytes) { return std::string(bytes.begin(), bytes.end()); }

inline PipelineRecording readDocument(std::string_view text) {
    const std::vector<uint8_t> data = bytesOf(text);
    return PipelineRecording(&data);
}

// What reading a document raised: the error's dynamic type and message, or nothing.
struct Failure {
    const std::type_info* kind = nullptr;
    std::string message;
};

inline std::optional<Failure> readFailure(const std::vector<uint8_t>* data) {
    try {
        PipelineRecording recording(data);
    } catch (const std::exception& error) {
        return Failure{&typeid(error), error.what()};
    }
    return std::nullopt;
}

inline std::optional<Failure> readFailure(std::string_view text) {
    const std::vector<uint8_t> data = bytesOf(text);
    return readFailure(&data);
}

// Every message a reading may raise, with the kind it is raised as. A wrapped message is the
// runtime error "migrateSerializedContainer failed: " followed by one of the migration's.
inline bool isListedFailure(const Failure& failure) {
    static const std::vector<std::string> plain = {
        "json not supplied", "invalid frames", "invalid frame type", "invalid frame timestamp",
        "invalid state key", "invalid state value class", "invalid report", "invalid hex string",
    };
    static const std::string wrapper = "migrateSerializedContainer failed: ";
    if (*failure.kind == typeid(std::invalid_argument)) {
        for (const std::string& message : plain) {
            if (failure.message == message) return true;
        }
        return false;
    }
    if (*failure.kind != typeid(std::runtime_error)) return false;
    if (failure.message.rfind(wrapper, 0) != 0) return false;
    const std::string inner = failure.message.substr(wrapper.size());
    if (inner == "invalid container" || inner == "invalid version" || inner == "frame lacks Timestamp" ||
        inner == "frame lacks ReportData") {
        return true;
    }
    static const std::string versionPrefix = "invalid container version: ";
    if (inner.rfind(versionPrefix, 0) != 0 || inner.size() == versionPrefix.size()) return false;
    return inner.find_first_not_of("0123456789", versionPrefix.size()) == std::string::npos;
}

}  // namespace TolkaTouch::Testing
