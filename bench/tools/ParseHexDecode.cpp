// The anchor for `tolkatouch replay --fast --json` of a long document: what the least a reader
// must do costs, with nothing of the project's in it. Loads the file into simdjson's padded
// buffer, walks every frame with the ondemand parser and decodes every report's hex text
// ("01 0a ff ") into bytes; prints the number of reports and decoded bytes. With --dom, parses
// with simdjson's DOM parser instead, which picks the fastest kernel the processor has at run time
// (the ondemand parser runs the one the compiler flags allow: the scalar one on baseline x86-64).
//
//   bench_parse_hex_decode [--dom] DOCUMENT

#include <cstdint>
#include <cstdio>
#include <string_view>
#include <vector>

#include <simdjson.h>

namespace {

int nibble(char c) {
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return -1;
}

// Hex pairs, spaces between them ignored.
void decode(std::string_view text, std::vector<uint8_t>& out) {
    out.clear();
    for (size_t i = 0; i + 1 < text.size();) {
        if (text[i] == ' ') {
            ++i;
            continue;
        }
        out.push_back(static_cast<uint8_t>(nibble(text[i]) << 4 | nibble(text[i + 1])));
        i += 2;
    }
}

}  // namespace

int main(int argc, char** argv) {
    const bool dom = argc == 3 && std::string_view(argv[1]) == "--dom";
    if (argc != 2 && !dom) {
        std::fprintf(stderr, "usage: bench_parse_hex_decode [--dom] DOCUMENT\n");
        return 2;
    }
    const char* path = argv[argc - 1];
    try {
        const simdjson::padded_string text = simdjson::padded_string::load(path);
        std::vector<uint8_t> report;
        uint64_t reports = 0;
        uint64_t bytes = 0;
        const auto take = [&](std::string_view hex) {
            decode(hex, report);
            ++reports;
            bytes += report.size();
        };
        if (dom) {
            simdjson::dom::parser parser;
            const simdjson::dom::element document = parser.parse(text);
            for (simdjson::dom::object frame : document["Frames"].get_array()) {
                std::string_view hex;
                if (!frame["Report"].get_string().get(hex)) take(hex);
            }
        } else {
            simdjson::ondemand::parser parser;
            simdjson::ondemand::document document = parser.iterate(text);
            for (simdjson::ondemand::object frame : document["Frames"].get_array()) {
                for (simdjson::ondemand::field field : frame) {
                    if (field.unescaped_key().value() == "Report") take(field.value().get_string().value());
                }
            }
        }
        std::printf("reports %llu, bytes %llu\n", static_cast<unsigned long long>(reports),
                    static_cast<unsigned long long>(bytes));
    } catch (const simdjson::simdjson_error& error) {
        std::fprintf(stderr, "bench_parse_hex_decode: %s: %s\n", path, error.what());
        return 1;
    }
    return 0;
}
