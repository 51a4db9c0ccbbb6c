#pragma once
// How `tolkatouch watch` shows one line of the daemon's live stream (daemon/WatchHub.h) on a
// terminal: log lines as "[level] category: message", input reports drawn on the pixel layout as
// `tolkatouch show` draws them, events as "event KIND region R (frame F)", and the count of lines
// lost. Control characters that came from the stream are shown escaped (newlines of a multi-line
// description stay).

#include <string>

namespace TolkaTouch::Tools {

// The text for one line of the stream, ending in a newline; a line that does not read is shown
// as "unreadable line from tolkatouchd: ..." rather than refused.
std::string watchLineText(const std::string& line);

}  // namespace TolkaTouch::Tools
