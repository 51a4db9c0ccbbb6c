#pragma once
// The sample recording compiled into the program: what `tolkatouch replay` plays without a
// document. The build embeds one of the documents of examples/.

#include <string_view>

namespace TolkaTouch::Tools {

// The document's JSON text.
std::string_view sampleRecordingDocument();

// The name it is reported under in messages.
inline constexpr const char* kSampleRecordingName = "(built-in sample)";

}  // namespace TolkaTouch::Tools
