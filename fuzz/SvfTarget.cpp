#include "fuzz/FuzzTargets.h"

#include "ports/sim/FlashModel.h"
#include "ports/svf/SvfError.h"
#include "ports/svf/SvfPlayer.h"

#include <string_view>

namespace vorant::fuzz {

void fuzzSvf(const std::uint8_t* data, std::size_t size) {
    sim::FlashConfig config;  // a small chip answering EF 40 10
    config.partName = "FUZZ";
    config.sizeBytes = 64 * 1024;
    config.jedecId[0] = 0xEF, config.jedecId[1] = 0x40, config.jedecId[2] = 0x10;
    sim::FlashModel flash(config);
    svf::SvfPlayer player(flash);
    try {
        player.playText(std::string_view(reinterpret_cast<const char*>(data), size));
    } catch (const svf::SvfError&) {
    }
}

}  // namespace vorant::fuzz
