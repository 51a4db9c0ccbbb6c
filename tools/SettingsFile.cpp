#include "tools/SettingsFile.h"

#include <cstdint>

#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {

std::vector<std::string> readSettingsFile(const std::string& path) {
    const std::vector<uint8_t> bytes = readFileBytes(path);
    std::vector<std::string> settings;
    std::string line;
    size_t number = 0;
    for (size_t i = 0; i <= bytes.size(); ++i) {
        if (i < bytes.size() && bytes[i] != '\n') {
            line += static_cast<char>(bytes[i]);
            continue;
        }
        ++number;
        while (!line.empty() && (line.back() == '\r' || line.back() == ' ' || line.back() == '\t')) line.pop_back();
        const size_t start = line.find_first_not_of(" \t");
        if (start != std::string::npos && line[start] != '#') {
            if (line.find('=') == std::string::npos) {
                throw ToolError(path, "line " + std::to_string(number) + ": expected KEY=VALUE");
            }
            settings.push_back(line.substr(start));
        }
        line.clear();
    }
    return settings;
}

std::vector<std::string> settingsWithFiles(const std::vector<std::string>& files, const std::vector<std::string>& settings) {
    std::vector<std::string> all;
    for (const std::string& file : files) {
        const std::vector<std::string> fromFile = readSettingsFile(file);
        all.insert(all.end(), fromFile.begin(), fromFile.end());
    }
    all.insert(all.end(), settings.begin(), settings.end());
    return all;
}

}  // namespace TolkaTouch::Tools
