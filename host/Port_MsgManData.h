#pragma once
#include "HostExport.h"

#include <cstdarg>
#include <string>

enum class MessageKind { Status, Info, Error, Debug };

struct Message {
    MessageKind kind;
    std::string domain;    // empty for debug traces
    std::string source;
    int line = 0;
    std::string revision;
    std::string text;
};

// Where messages go. The host installs exactly one sink; with none installed
// messages are dropped.
class VORANT_HOST_API MessageSink {
public:
    virtual ~MessageSink();
    virtual void receive(const Message& message) = 0;
};

// The message manager. A message is issued in two calls:
//   Port_MsgManData::createObject(domain, source, line, revision).issueStatus(fmt, ...);
class VORANT_HOST_API Port_MsgManData {
public:
    static Port_MsgManData& createObject(const char* domain, const char* source, int line,
                                         const char* revision);
    void issueStatus(const char* format, ...) VORANT_PRINTF(2, 3);
    void issueInfo(const char* format, ...) VORANT_PRINTF(2, 3);
    void issueError(const char* format, ...) VORANT_PRINTF(2, 3);
    // A diagnostic line without domain or source; sinks may drop it.
    static void debugStub(const char* format, ...) VORANT_PRINTF(1, 2);

    // Installs the sink (not owned); returns the previous one. Null drops
    // every message.
    static MessageSink* setSink(MessageSink* sink);
    static MessageSink* sink();

private:
    void issue(MessageKind kind, const char* format, std::va_list args);
    std::string domain_, source_, revision_;
    int line_ = 0;
};

// The host library's own portability initialisers. A library that uses the
// host constructs one of each at load, in the order FileInit, PathListInit,
// InstanceTableInit, FactoryInit, Port_MsgManInit, and destroys them in
// reverse at unload. Each keeps a count of live instances, and every
// construction and destruction is logged so the order can be checked.
namespace Port {
class VORANT_HOST_API FileInit { public: FileInit(); ~FileInit(); };
class VORANT_HOST_API PathListInit { public: PathListInit(); ~PathListInit(); };
// "+Name" for a construction, "-Name" for a destruction, oldest first.
VORANT_HOST_API std::string initialiserLog();
}  // namespace Port
namespace CitP {
class VORANT_HOST_API InstanceTableInit { public: InstanceTableInit(); ~InstanceTableInit(); };
class VORANT_HOST_API FactoryInit { public: FactoryInit(); ~FactoryInit(); };
}  // namespace CitP
class VORANT_HOST_API Port_MsgManInit { public: Port_MsgManInit(); ~Port_MsgManInit(); };
