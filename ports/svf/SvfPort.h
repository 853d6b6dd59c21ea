#pragma once
// The SVF recorder as a port of the port table: "svf:FILE" records the
// scans into FILE, which appears only when the run succeeds.

#include "ports/Port.h"
#include "ports/PortTable.h"
#include "ports/svf/SvfRecorder.h"

#include <memory>
#include <string>

namespace vorant::svf {

class SvfPort final : public ports::Port {
public:
    // Throws PortError (BadRequest) when the file cannot be written;
    // nothing is created then.
    SvfPort(const ports::PortAddress& address, const ports::PortContext& context);

    ScanPort& scan() override { return *recorder_; }
    // Throws PortError (Unavailable) when the file could not be completed.
    void commit() override;
    void abandon() override { recorder_.reset(); }
    bool writesInPlace() const override { return recorder_ && !recorder_->replacesTarget(); }

    SvfRecorder& recorder() { return *recorder_; }

private:
    std::unique_ptr<SvfRecorder> recorder_;
};

// The row of the port table.
const ports::PortInfo& svfPortInfo();

}  // namespace vorant::svf
