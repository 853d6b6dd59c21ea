#include "MessageSinks.h"

namespace vorant {

ConsoleSink::ConsoleSink(std::FILE* out, std::FILE* err, bool showDebug, bool quiet)
    : out_(out), err_(err), showDebug_(showDebug), quiet_(quiet) {}

void ConsoleSink::receive(const Message& message) {
    switch (message.kind) {
    case MessageKind::Status:
        if (!quiet_) std::fputs(message.text.c_str(), out_);
        break;
    case MessageKind::Info:
        if (!quiet_) std::fprintf(out_, "INFO: %s", message.text.c_str());
        break;
    case MessageKind::Error:
        std::fprintf(err_, "ERROR: %s", message.text.c_str());
        break;
    case MessageKind::Debug:
        if (showDebug_) std::fprintf(err_, "DEBUG: %s", message.text.c_str());
        break;
    }
    // Debug traces may lack a line break; keep the console tidy.
    if (message.kind == MessageKind::Debug && showDebug_ &&
        (message.text.empty() || message.text.back() != '\n'))
        std::fputc('\n', err_);
}

void CapturingSink::receive(const Message& message) {
    std::lock_guard<std::mutex> lock(mutex_);
    messages_.push_back(message);
}

std::vector<Message> CapturingSink::messages() const {
    std::lock_guard<std::mutex> lock(mutex_);
    return messages_;
}

std::vector<std::string> CapturingSink::texts(MessageKind kind) const {
    std::lock_guard<std::mutex> lock(mutex_);
    std::vector<std::string> result;
    for (const auto& m : messages_)
        if (m.kind == kind) result.push_back(m.text);
    return result;
}

std::string CapturingSink::transcript() const {
    std::lock_guard<std::mutex> lock(mutex_);
    std::string all;
    for (const auto& m : messages_)
        if (m.kind != MessageKind::Debug) all += m.text;
    return all;
}

void CapturingSink::clear() {
    std::lock_guard<std::mutex> lock(mutex_);
    messages_.clear();
}

ScopedSink::ScopedSink(MessageSink* sink) : previous_(Port_MsgManData::setSink(sink)) {}
ScopedSink::~ScopedSink() { Port_MsgManData::setSink(previous_); }

}  // namespace vorant
