#include "platform/LogArguments.h"

#include <cstdarg>

#include "platform/Format.h"

namespace TolkaTouch {

std::string LogArguments::formatUnchecked(const char* format, ...) {
    va_list args;
    va_start(args, format);
    std::string text = formatStringV(format, args);
    va_end(args);
    return text;
}

}  // namespace TolkaTouch
