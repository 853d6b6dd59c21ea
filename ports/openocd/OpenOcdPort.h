#pragma once
// OpenOCD as a live cable: "openocd[:HOST[:PORT]]" (default localhost:6666)
// with tap=NAME and the bridge keys. One connection for the run; the JTAG
// port buffers each transaction into one drscan of the chosen bridge.

#include "ports/Port.h"
#include "ports/PortTable.h"
#include "ports/jtag/JtagPort.h"
#include "ports/openocd/OpenOcdSink.h"
#include "ports/openocd/TclRpcIo.h"

#include <memory>
#include <string>

namespace vorant::ports::openocd {

class OpenOcdPort final : public Port {
public:
    // Opens over `io` (connected); throws PortError (Unavailable) when
    // OpenOCD has no such TAP or does not answer.
    OpenOcdPort(std::unique_ptr<TclRpcIo> io, const PortAddress& address, const std::string& where);
    ~OpenOcdPort() override;

    ScanPort& scan() override { return *port_; }
    // Sends what is still queued; throws PortError (Unavailable) if that fails.
    void commit() override;

    OpenOcdSink& sink() { return *sink_; }

private:
    std::unique_ptr<TclRpcIo> io_;
    std::unique_ptr<OpenOcdSink> sink_;
    std::unique_ptr<jtag::JtagPort> port_;
};

const PortInfo& openOcdPortInfo();

}  // namespace vorant::ports::openocd
