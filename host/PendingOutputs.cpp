#include "PendingOutputs.h"

#include <mutex>
#include <utility>

namespace vorant {
namespace {

struct Registry {
    std::mutex mutex;
    std::vector<std::unique_ptr<AtomicOutputFile>> files;
};

Registry& registry() {
    // Destroyed at exit, which discards whatever nobody published.
    static Registry instance;
    return instance;
}

std::vector<std::unique_ptr<AtomicOutputFile>> takeAll() {
    Registry& r = registry();
    std::lock_guard<std::mutex> lock(r.mutex);
    return std::exchange(r.files, {});
}

}  // namespace

void PendingOutputs::add(std::unique_ptr<AtomicOutputFile> file) {
    if (!file) return;
    Registry& r = registry();
    std::lock_guard<std::mutex> lock(r.mutex);
    r.files.push_back(std::move(file));
}

std::vector<std::string> PendingOutputs::commitAll() {
    std::vector<std::string> errors;
    for (const auto& file : takeAll()) {
        std::string error;
        if (!file->publish(error)) errors.push_back(error);
    }
    return errors;
}

std::size_t PendingOutputs::discardAll() { return takeAll().size(); }

std::size_t PendingOutputs::count() {
    Registry& r = registry();
    std::lock_guard<std::mutex> lock(r.mutex);
    return r.files.size();
}

}  // namespace vorant
