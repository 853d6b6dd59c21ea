#pragma once
#include "host/MessageSinks.h"

#include <cstdio>

namespace vorant::cli {

class ProgressDisplay;

// The console sink, with room made for a progress bar: while a bar is on
// the terminal, every message first clears its line and the bar is drawn
// again below the message.
class ProgressAwareSink final : public MessageSink {
public:
    ProgressAwareSink(std::FILE* out, std::FILE* err, bool showDebug, bool quiet);

    void receive(const Message& message) override;
    // The bar to keep tidy (not owned); null when none is shown.
    void setDisplay(ProgressDisplay* display) { display_ = display; }
    void setQuiet(bool quiet) { console_.setQuiet(quiet); }

private:
    vorant::ConsoleSink console_;
    std::FILE* out_;
    std::FILE* err_;
    ProgressDisplay* display_ = nullptr;
};

}  // namespace vorant::cli
