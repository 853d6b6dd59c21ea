// The tool as a user runs it, measured from outside: CPU time (user +
// system) and peak RSS of `vorant-spi program` of a 16 MiB image on the
// simulated W25Q128JV, beside flashrom's emulated write and verify of the
// same image in the same run (when flashrom is installed), and what a
// refused image 100 bytes long at 0x1FFFFF00 costs beside an `idcode` run.
// Each job runs three times; the least CPU and the largest RSS count.
//
//   vorant-tool-bench
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <thread>
#include <vector>

namespace {

namespace fs = std::filesystem;

struct Usage {
    bool ran = false;
    int status = -1;
    double cpuSeconds = 0;
    long peakKiB = 0;
};

double seconds(const timeval& t) { return static_cast<double>(t.tv_sec) + t.tv_usec / 1e6; }

// Runs a program quietly in `dir`; gives up (and kills it) after 300 s.
Usage runOnce(std::vector<std::string> args, const fs::path& dir) {
    std::vector<char*> argv;
    for (std::string& arg : args) argv.push_back(arg.data());
    argv.push_back(nullptr);
    std::fflush(stdout);  // a child must not inherit unwritten output
    const pid_t pid = fork();
    if (pid == 0) {
        if (freopen("/dev/null", "w", stdout) == nullptr || freopen("/dev/null", "w", stderr) == nullptr ||
            chdir(dir.c_str()) != 0)
            _exit(126);
        execvp(argv[0], argv.data());
        _exit(127);
    }
    Usage usage;
    if (pid < 0) return usage;
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(300);
    int status = 0;
    rusage resources{};
    while (wait4(pid, &status, WNOHANG, &resources) == 0) {
        if (std::chrono::steady_clock::now() > deadline) {
            kill(pid, SIGKILL);
            wait4(pid, &status, 0, &resources);
            return usage;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    usage.ran = WIFEXITED(status) && WEXITSTATUS(status) != 127;
    usage.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    usage.cpuSeconds = seconds(resources.ru_utime) + seconds(resources.ru_stime);
    usage.peakKiB = resources.ru_maxrss;
    return usage;
}

// Three runs: the least CPU, the largest RSS. `before` runs ahead of each
// (a fresh emulated chip for flashrom).
Usage measure(const std::vector<std::string>& args, const fs::path& dir, void (*before)(const fs::path&) = nullptr) {
    Usage best;
    for (int run = 0; run < 3; ++run) {
        if (before != nullptr) before(dir);
        const Usage usage = runOnce(args, dir);
        if (!usage.ran) return usage;
        if (!best.ran || usage.cpuSeconds < best.cpuSeconds) best.cpuSeconds = usage.cpuSeconds;
        best.peakKiB = std::max(best.peakKiB, usage.peakKiB);
        best.status = usage.status;
        best.ran = true;
    }
    return best;
}

void print(const char* name, const Usage& usage) {
    if (!usage.ran) {
        std::printf("%-44s did not run\n", name);
        return;
    }
    std::printf("%-44s exit %d  cpu %6.3f s  peak RSS %7ld KiB\n", name, usage.status, usage.cpuSeconds, usage.peakKiB);
}

void writeFile(const fs::path& path, const std::string& bytes) { std::ofstream(path, std::ios::binary) << bytes; }

// Intel HEX: 100 bytes at 0x1FFFFF00, past every part.
std::string farHexImage() {
    auto record = [](unsigned type, unsigned address, const std::vector<unsigned>& data) {
        std::vector<unsigned> bytes = {static_cast<unsigned>(data.size()), address >> 8 & 0xFF, address & 0xFF, type};
        bytes.insert(bytes.end(), data.begin(), data.end());
        unsigned sum = 0;
        std::string line = ":";
        char hex[3];
        for (unsigned byte : bytes) {
            sum += byte;
            std::snprintf(hex, sizeof hex, "%02X", byte);
            line += hex;
        }
        std::snprintf(hex, sizeof hex, "%02X", (0x100 - sum % 0x100) & 0xFF);
        return line + hex + "\n";
    };
    std::vector<unsigned> data(100);
    for (unsigned i = 0; i < data.size(); ++i) data[i] = i;
    return record(4, 0, {0x1F, 0xFF}) + record(0, 0xFF00, data) + ":00000001FF\n";
}

void freshEmulatedChip(const fs::path& dir) { fs::remove(dir / "emulated.bin"); }

}  // namespace

int main(int, char** argv) {
    const fs::path tool = fs::canonical("/proc/self/exe").parent_path() / "vorant-spi";
    (void)argv;
    char pattern[] = "/tmp/vorant-tool-bench-XXXXXX";
    if (mkdtemp(pattern) == nullptr) return 1;
    const fs::path dir = pattern;
    constexpr std::size_t kImageBytes = 16u << 20;
    {
        std::string image(kImageBytes, '\0');
        std::mt19937 generator(7);
        for (char& byte : image) byte = static_cast<char>(generator());
        writeFile(dir / "image.bin", image);
    }
    writeFile(dir / "far.hex", farHexImage());
    const std::vector<std::string> sim = {tool.string(), "--quiet", "--port", "sim", "--part", "W25Q128JV"};
    auto with = [](std::vector<std::string> args, std::initializer_list<std::string> more) {
        args.insert(args.end(), more);
        return args;
    };

    std::printf("vorant-spi from outside, on a simulated W25Q128JV, a 16 MiB image (least CPU of three runs)\n");
    const Usage program = measure(with(sim, {"program", "image.bin"}), dir);
    const Usage wholeChip = measure(with(sim, {"program", "-e", "image.bin"}), dir);
    const Usage flashrom = measure({"flashrom", "-p", "dummy:emulate=W25Q128FV,image=emulated.bin", "-w", "image.bin"},
                                   dir, &freshEmulatedChip);
    const Usage idcode = measure(with(sim, {"idcode"}), dir);
    const Usage farHex = measure(with(sim, {"program", "far.hex"}), dir);
    print("program image.bin (erase what it covers, verify)", program);
    print("program -e image.bin (bulk erase, verify)", wholeChip);
    print("flashrom emulated write + verify", flashrom);
    print("idcode", idcode);
    print("program far.hex (refused)", farHex);
    if (program.ran && flashrom.ran && flashrom.status == 0 && flashrom.cpuSeconds > 0)
        std::printf("CPU of program / flashrom: %.3f (target under 0.15)\n", program.cpuSeconds / flashrom.cpuSeconds);
    else
        std::printf("CPU of program / flashrom: flashrom not available here\n");
    const double image = kImageBytes / 1024.0;
    std::printf("peak RSS of program / image: %.2f (image plus simulated chip: 2.00; target at most 2.2)\n",
                program.peakKiB / image);
    std::printf("peak RSS of the refused far.hex / idcode: %.2f (target at most 1)\n",
                idcode.peakKiB > 0 ? static_cast<double>(farHex.peakKiB) / idcode.peakKiB : 0.0);
    fs::remove_all(dir);
    return 0;
}
