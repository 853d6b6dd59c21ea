#include "ports/svf/SvfPort.h"

#include "ports/PortError.h"
#include "ports/svf/SvfError.h"

namespace vorant::svf {

SvfPort::SvfPort(const std::string& file, const ports::PortContext& context) {
    SvfRecorderOptions options;
    options.toolName = context.toolName;
    options.partName = context.partName;
    try {
        recorder_ = std::make_unique<SvfRecorder>(file, options);
    } catch (const SvfError& error) {
        throw ports::PortError(ports::PortError::Kind::BadRequest,
                               std::string(error.what()) + "; record into a folder that exists and can be written");
    }
}

void SvfPort::commit() {
    if (!recorder_ || recorder_->finished()) return;
    try {
        recorder_->finish();
    } catch (const SvfError& error) {
        throw ports::PortError(ports::PortError::Kind::Unavailable, error.what());
    }
}

const ports::PortInfo& svfPortInfo() {
    static const ports::PortInfo row = [] {
        ports::PortInfo info;
        info.name = "svf";
        info.synopsis = {
            {"svf:FILE", "record the scans as SVF into FILE; the file appears only when the operation succeeds "
                         "(a failed or cancelled run leaves no file and leaves an existing FILE untouched)"},
        };
        info.path = ports::PathUse::Required;
        info.pathName = "FILE";
        info.caps = {.readsBack = false, .records = true, .simulatesChip = false, .hasBusClock = false,
                     .takesSimFaults = false};
        info.open = [](const ports::PortAddress& address, const ports::PortContext& context) -> std::unique_ptr<ports::Port> {
            return std::make_unique<SvfPort>(address.path, context);
        };
        return info;
    }();
    return row;
}

}  // namespace vorant::svf
