#include "ports/svf/SvfFileCheck.h"

#include "ports/svf/SvfError.h"
#include "ports/svf/SvfParser.h"

#include <fstream>

namespace vorant::svf {

SvfContents checkSvf(std::istream& in) {
    SvfParser parser(in);
    SvfStatement statement;
    SvfContents contents;
    while (parser.next(statement)) {
        ++contents.statements;
        const bool scan = statement.command == SvfCommand::Sdr || statement.command == SvfCommand::Sir;
        if (scan && statement.scan.length > 0) ++contents.scans;
    }
    return contents;
}

SvfContents checkSvfFile(const std::filesystem::path& file) {
    std::ifstream in(file, std::ios::binary);
    if (!in) throw SvfError("cannot read '" + file.string() + "'");
    SvfContents contents;
    try {
        contents = checkSvf(in);
    } catch (const SvfParseError& error) {
        throw SvfParseError(error.line(), error.reason() + " (in '" + file.string() + "')");
    }
    if (in.bad()) throw SvfError("cannot read '" + file.string() + "'");
    return contents;
}

}  // namespace vorant::svf
