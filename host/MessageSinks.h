#pragma once
#include "HostExport.h"
#include "Port_MsgManData.h"

#include <cstdio>
#include <mutex>
#include <vector>

namespace vorant {

// Prints status lines as they are, info with "INFO: ", errors with "ERROR: "
// on the error stream, debug traces only when asked.
class VORANT_HOST_API ConsoleSink : public MessageSink {
public:
    ConsoleSink(std::FILE* out, std::FILE* err, bool showDebug, bool quiet = false);
    void receive(const Message& message) override;
    // --quiet hides status and info lines; an operation whose status lines
    // are its answer (an ID, the registers) shows them all the same.
    void setQuiet(bool quiet) { quiet_ = quiet; }

private:
    std::FILE* out_;
    std::FILE* err_;
    bool showDebug_;
    bool quiet_;
};

// Keeps every message for tests to inspect.
class VORANT_HOST_API CapturingSink : public MessageSink {
public:
    void receive(const Message& message) override;
    std::vector<Message> messages() const;
    // The texts of the messages of one kind, in order.
    std::vector<std::string> texts(MessageKind kind) const;
    // Every non-debug text concatenated, for coarse assertions.
    std::string transcript() const;
    void clear();

private:
    mutable std::mutex mutex_;
    std::vector<Message> messages_;
};

// Installs a sink for the lifetime of this object and restores the previous
// one afterwards.
class VORANT_HOST_API ScopedSink {
public:
    explicit ScopedSink(MessageSink* sink);
    ~ScopedSink();
    ScopedSink(const ScopedSink&) = delete;
    ScopedSink& operator=(const ScopedSink&) = delete;

private:
    MessageSink* previous_;
};

}  // namespace vorant
