// Every operation under every kind of fault, at an early, a middle and the
// last page: a run may end well only with the flash (or the file read from
// it) exactly as asked, and a run that fails must say why, must not claim
// anything it did not prove, and must leave no output file.
#include "tests/cli/ToolTestFixture.h"

namespace vorant::cli::test {
namespace {

constexpr std::size_t kPageBytes = 256;
constexpr std::size_t kImagePages = 8;
constexpr std::size_t kFlashPages = kSimBytes / kPageBytes;

enum class Start { Erased, Programmed };
enum class Fault { Shift, Wait, StuckBusy, StuckBit, Cancel };

struct OperationCase {
    const char* name;
    Args args;
    Start start;
    std::size_t lastPage;  // the page count the operation goes through
};

struct FaultCase {
    Fault fault;
    const char* name;
    // The words a failed run must print somewhere, one of them at least.
    std::vector<std::string> causes;
};

class FaultTable : public ToolTest {
protected:
    void SetUp() override {
        image = randomBytes(kImagePages * kPageBytes, 77);
        write("image.bin", image);
        ok(Args{"--quiet", "--part", "W25Q16JV", "--port", "sim:erased.sim", "blankcheck"});
        ok(Args{"--quiet", "--part", "W25Q16JV", "--port", "sim:programmed.sim", "program", "image.bin", "-e"});
        erased = read("erased.sim");
        programmed = read("programmed.sim");
    }

    std::string image, erased, programmed;
};

// The fault as the simulator's option, aimed at page `page` (from 1).
std::string faultOption(Fault fault, std::size_t page, const std::string& image, std::string& stuckAddress) {
    const std::size_t address = (page - 1) * kPageBytes + 5;
    switch (fault) {
    case Fault::Shift: return "fail-shift=page:" + std::to_string(page);
    case Fault::Wait: return "fail-wait=page:" + std::to_string(page);
    case Fault::StuckBusy: return "stuck-busy";
    case Fault::StuckBit: {
        // The whole byte stuck at the complement of what the image holds
        // there, so a read of it can never pass for right.
        const auto wanted = static_cast<unsigned char>(address < image.size() ? image[address] : 0xFF);
        char text[48];
        std::snprintf(text, sizeof text, "stuck-bit=0x%zX:0xFF:0x%02X", address, wanted ^ 0xFFu);
        stuckAddress = std::to_string(address);
        return text;
    }
    case Fault::Cancel: return "cancel-after=" + std::to_string(page);
    }
    return {};
}

TEST_F(FaultTable, EveryRunIsHonest) {
    const std::string imageFlash = flashWith(image);
    const OperationCase operations[] = {
        {"program -e -v", {"program", "image.bin", "-e", "-v"}, Start::Programmed, kImagePages},
        {"verify", {"verify", "image.bin"}, Start::Programmed, kImagePages},
        {"checksum", {"checksum", "image.bin"}, Start::Programmed, kImagePages},
        {"blankcheck", {"blankcheck"}, Start::Erased, kFlashPages},
        {"readback", {"readback", "-f", "out.bin"}, Start::Programmed, kFlashPages},
        {"erase", {"erase"}, Start::Programmed, kFlashPages},
    };
    const FaultCase faults[] = {
        {Fault::Shift, "failed shift", {"injected fault"}},
        {Fault::Wait, "failed wait", {"injected fault"}},
        {Fault::StuckBusy, "stuck busy", {"did not complete", "exceeded the allocated time"}},
        {Fault::StuckBit, "stuck bit", {"Failed at address", "Checksums differ", "not blank"}},
        {Fault::Cancel, "cancel", {"cancelled"}},
    };
    const char* const claims[] = {"completed", "match", "Part is blank"};

    for (const OperationCase& operation : operations) {
        for (const FaultCase& fault : faults) {
            for (std::size_t page : {std::size_t{1}, operation.lastPage / 2, operation.lastPage}) {
                std::string stuckAddress;
                const std::string option = faultOption(fault.fault, page, image, stuckAddress);
                SCOPED_TRACE(std::string(operation.name) + " with " + option);
                fs::remove(dir / "out.bin");
                write("flash.sim", operation.start == Start::Erased ? erased : programmed);
                const Result result =
                    run(Args{"--part", "W25Q16JV", "--port", "sim:flash.sim", "--sim-fault", option} + operation.args);
                const std::string flash = flashBytes(read("flash.sim"));
                const std::string before = flashBytes(operation.start == Start::Erased ? erased : programmed);

                if (result.status == 0) {
                    // Success only with the flash exactly as asked: the image
                    // after program, verify and checksum, erased after erase
                    // and a blank check, untouched by a readback.
                    const std::string name = operation.name;
                    const std::string asked = name == "readback"                       ? before
                                              : name == "erase" || name == "blankcheck" ? std::string(kSimBytes, '\xff')
                                                                                        : imageFlash;
                    EXPECT_TRUE(flash == asked) << result.text();
                    if (name == "readback") {
                        std::string expected = flash;
                        if (!stuckAddress.empty()) {
                            const std::size_t at = std::stoul(stuckAddress);
                            expected[at] = static_cast<char>(static_cast<unsigned char>(flash[at]) ^ 0xFFu);
                        }
                        EXPECT_TRUE(read("out.bin") == expected) << "the file holds what the chip answered";
                    }
                    continue;
                }
                EXPECT_EQ(result.status, 1) << result.text();
                bool named = false;
                for (const std::string& cause : fault.causes) named = named || has(result.out + result.err, cause);
                EXPECT_TRUE(named) << "no line names the cause\n" << result.text();
                for (const char* claim : claims) EXPECT_FALSE(has(result.out, claim)) << result.text();
                EXPECT_FALSE(fs::exists(dir / "out.bin")) << "a failed readback published its file";
            }
        }
    }
}

}  // namespace
}  // namespace vorant::cli::test
