#include "cli/PortChoice.h"

#include "cli/UsageError.h"

namespace vorant::cli {

PortChoice parsePortChoice(const std::string& text) {
    const std::string hint = "use --port sim, --port sim:FILE or --port svf:FILE";
    PortChoice info;
    if (text == "sim") return info;
    const std::size_t colon = text.find(':');
    const std::string kind = text.substr(0, colon);
    // Everything after the first colon is the file, so Windows paths such as
    // sim:C:\flash.bin keep their drive letter.
    const std::string file = colon == std::string::npos ? std::string() : text.substr(colon + 1);
    if (kind == "sim") {
        if (file.empty()) throw UsageError("--port sim: needs a file name after the colon; " + hint);
        info.file = file;
        return info;
    }
    if (kind == "svf") {
        if (file.empty()) throw UsageError("--port svf needs the file to record: --port svf:FILE");
        info.kind = PortChoice::Kind::SvfRecorder;
        info.file = file;
        return info;
    }
    throw UsageError("unknown port '" + text + "'; " + hint);
}

}  // namespace vorant::cli
