#include "cli/ToolMessages.h"

#include "host/Port_MsgManData.h"

namespace vorant::cli {

namespace {

Port_MsgManData& toolMessage(int line) {
    return Port_MsgManData::createObject("vorant-spi", "cli/ToolMessages", line, VORANT_REVISION);
}

}  // namespace

void toolStatus(const std::string& text) { toolMessage(__LINE__).issueStatus("%s\n", text.c_str()); }
void toolInfo(const std::string& text) { toolMessage(__LINE__).issueInfo("%s\n", text.c_str()); }
void toolError(const std::string& text) { toolMessage(__LINE__).issueError("%s\n", text.c_str()); }

}  // namespace vorant::cli
