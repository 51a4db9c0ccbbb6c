// tolkatouch convert: reads a recording in either form (the document of any accepted version, or
// the line-per-report form) and writes it as the version-1 document or in the line form, a frame
// at a time.

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>

#include "pipeline/RecordingDocumentWriter.h"
#include "pipeline/RecordingLines.h"
#include "tools/Commands.h"
#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {

namespace {

struct ConvertArguments {
    std::string document;
    std::string output;
    std::string to = "document";
};

// Where the converted text goes: standard output, or a file beside the target that replaces it
// once everything is written (so converting a file onto itself, or failing half-way, loses nothing).
class Output {
public:
    explicit Output(const std::string& path) : _path(path) {
        if (path == "-") {
            _file = stdout;
            return;
        }
        _temporary = path + ".converting";
        _file = std::fopen(_temporary.c_str(), "wbe");
        if (_file == nullptr) throw ToolError(path, std::strerror(errno));
    }
    ~Output() {
        if (_file != nullptr && _file != stdout) {
            std::fclose(_file);
            std::remove(_temporary.c_str());
        }
    }
    RecordingLinesWriter::Sink sink() {
        return [this](std::string_view bytes) {
            if (std::fwrite(bytes.data(), 1, bytes.size(), _file) != bytes.size()) throw ToolError(_path, std::strerror(errno));
        };
    }
    void commit() {
        if (std::fflush(_file) != 0) throw ToolError(_path, std::strerror(errno));
        if (_file == stdout) return;
        const bool closed = std::fclose(_file) == 0;
        _file = nullptr;
        if (!closed || std::rename(_temporary.c_str(), _path.c_str()) != 0) {
            const int error = errno;
            std::remove(_temporary.c_str());
            throw ToolError(_path, std::strerror(error));
        }
    }

private:
    std::string _path;
    std::string _temporary;
    std::FILE* _file = nullptr;
};

void runConvert(const ConvertArguments& arguments) {
    RecordingFile input(arguments.document);
    Output output(arguments.output);
    PipelineRecording::Frame frame;
    if (arguments.to == "lines") {
        // A document carries no header; a recording in the line form keeps its own.
        RecordingLinesWriter writer(output.sink(), input.reader().header());
        while (input.next(frame)) writer.writeFrame(frame);
        writer.flush();
    } else {
        RecordingDocumentWriter writer(output.sink());
        while (input.next(frame)) writer.writeFrame(frame);
        writer.finish("\n");
    }
    output.commit();
}

}  // namespace

void addConvertCommand(CLI::App& app) {
    auto arguments = std::make_shared<ConvertArguments>();
    CLI::App* command = app.add_subcommand(
        "convert",
        "Read a recording in either form (a document of any accepted version, or the line-per-report form) and "
        "write it as a version-1 document or in the line form.");
    command->add_option("DOCUMENT", arguments->document, "Recording document; - reads standard input")->required();
    command->add_option("-o,--output", arguments->output, "Where to write the converted recording; - for standard output")
        ->type_name("OUT")
        ->required();
    command->add_option("--to", arguments->to, "The form to write: document (the default) or lines")
        ->type_name("FORM")
        ->check(CLI::IsMember({"document", "lines"}));
    command->callback([arguments] { runConvert(*arguments); });
}

}  // namespace TolkaTouch::Tools
