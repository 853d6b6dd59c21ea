#include "cli/ImageCheck.h"

#include "cli/PartListing.h"
#include "cli/UsageError.h"
#include "formats/ConfigDataFiles.h"
#include "formats/FormatError.h"
#include "host/AtomicOutputFile.h"
#include "host/ConstraintsManager.h"
#include "host/VorantException.h"

#include <cstdint>

namespace vorant::cli {

std::unique_ptr<ConfigDataReader> openImage(const std::string& path, const formats::ImageOptions& options) {
    try {
        return formats::openConfigData(path, options);
    } catch (const formats::FormatError& error) {
        throw UsageError(std::string(error.what()) + "; give a readable binary, Intel HEX or S-record image");
    }
}

void checkImageFits(ConfigDataReader& image, const std::string& path, const std::string& partName) {
    const std::int64_t deviceBits =
        ConstraintsManager::instance().getDeviceLongProperty(partName.c_str(), "DEVICE_SIZE");
    const std::int64_t imageBits = image.dataSize();
    if (imageBits <= deviceBits) return;
    throw UsageError(path + " reaches address " + std::to_string(imageBits / 8) + " but " + partName +
                     " holds " + sizeText(deviceBits / 8) + "; use a larger part or a smaller image");
}

void checkReadbackTarget(const std::string& path) {
    try {
        // Opens nothing: a FIFO's reader would take the close for the end.
        AtomicOutputFile::checkWritable(path);
    } catch (const VorantException& error) {
        throw UsageError(std::string(error.what()) + "; choose a file in a folder that exists and can be written");
    }
}

}  // namespace vorant::cli
