// tolkatouch convert: reads any document the reader accepts (the older version 0 included) and
// writes it as the current version.

#include <memory>
#include <string>

#include <CLI/CLI.hpp>

#include "tools/Commands.h"
#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {

namespace {

struct ConvertArguments {
    std::string document;
    std::string output;
};

void runConvert(const ConvertArguments& arguments) {
    PipelineRecording recording = loadRecording(arguments.document);
    std::vector<uint8_t> document = recording.json();
    document.push_back('\n');
    writeFileBytes(arguments.output, document);
}

}  // namespace

void addConvertCommand(CLI::App& app) {
    auto arguments = std::make_shared<ConvertArguments>();
    CLI::App* command =
        app.add_subcommand("convert", "Read a recording document of any accepted version and write it as version 1.");
    command->add_option("DOCUMENT", arguments->document, "Recording document; - reads standard input")->required();
    command->add_option("-o,--output", arguments->output, "Where to write the version-1 document; - for standard output")
        ->type_name("OUT")
        ->required();
    command->callback([arguments] { runConvert(*arguments); });
}

}  // namespace TolkaTouch::Tools
