#include "Port_MsgManData.h"

#include <atomic>
#include <mutex>
#include <string>

#include "PortString.h"

namespace {

std::atomic<MessageSink*> installedSink{nullptr};

// Kept alive until the process ends: initialisers of other libraries are
// destroyed at their unload, which may come after this library's statics.
std::mutex& initLogMutex() {
    static auto* mutex = new std::mutex;
    return *mutex;
}
std::string& initLog() {
    static auto* log = new std::string;
    return *log;
}
void logInit(const char* entry) {
    std::lock_guard<std::mutex> lock(initLogMutex());
    initLog() += entry;
    initLog() += ' ';
}

void deliver(Message&& message) {
    if (MessageSink* sink = installedSink.load()) sink->receive(message);
}

}  // namespace

MessageSink::~MessageSink() = default;

Port_MsgManData& Port_MsgManData::createObject(const char* domain, const char* source, int line,
                                               const char* revision) {
    // One message object per thread: createObject and the issue call that
    // follows it are always made together by the same caller.
    thread_local Port_MsgManData object;
    object.domain_ = domain ? domain : "";
    object.source_ = source ? source : "";
    object.revision_ = revision ? revision : "";
    object.line_ = line;
    return object;
}

void Port_MsgManData::issue(MessageKind kind, const char* format, std::va_list args) {
    deliver(Message{kind, domain_, source_, line_, revision_, Port::vformat(format, args)});
}

void Port_MsgManData::issueStatus(const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    issue(MessageKind::Status, format, args);
    va_end(args);
}

void Port_MsgManData::issueInfo(const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    issue(MessageKind::Info, format, args);
    va_end(args);
}

void Port_MsgManData::issueError(const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    issue(MessageKind::Error, format, args);
    va_end(args);
}

void Port_MsgManData::debugStub(const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    deliver(Message{MessageKind::Debug, "", "", 0, "", Port::vformat(format, args)});
    va_end(args);
}

MessageSink* Port_MsgManData::setSink(MessageSink* sink) { return installedSink.exchange(sink); }
MessageSink* Port_MsgManData::sink() { return installedSink.load(); }

namespace Port {
FileInit::FileInit() { logInit("+FileInit"); }
FileInit::~FileInit() { logInit("-FileInit"); }
PathListInit::PathListInit() { logInit("+PathListInit"); }
PathListInit::~PathListInit() { logInit("-PathListInit"); }
std::string initialiserLog() {
    std::lock_guard<std::mutex> lock(initLogMutex());
    return initLog();
}
}  // namespace Port

namespace CitP {
InstanceTableInit::InstanceTableInit() { logInit("+InstanceTableInit"); }
InstanceTableInit::~InstanceTableInit() { logInit("-InstanceTableInit"); }
FactoryInit::FactoryInit() { logInit("+FactoryInit"); }
FactoryInit::~FactoryInit() { logInit("-FactoryInit"); }
}  // namespace CitP

Port_MsgManInit::Port_MsgManInit() { logInit("+Port_MsgManInit"); }
Port_MsgManInit::~Port_MsgManInit() { logInit("-Port_MsgManInit"); }
