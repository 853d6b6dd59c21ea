#pragma once
#include "HostExport.h"

#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <vector>

// The process-wide part database. Every part is a set of property keys with
// text values (numbers as decimal text, flags as "TRUE"/"FALSE").
//
// Part files are TOML:
//
//   [family.W25Q]                 # keys shared by a family
//   ENABLE_INSTRUCTION = "00000110"
//   ...
//   [part.W25Q128JV]              # a part; `extends` names its family
//   extends = "W25Q"
//   DEVICE_SIZE = 134217728
//
// A family may extend another family. Keys of the part override those of
// its family. Integers and booleans are stored as decimal text and
// "TRUE"/"FALSE". A later file may redefine a part or family; the loaders
// report each part that replaced one from another file.
//
// Part names match without regard to letter case: "w25q128jv" finds
// W25Q128JV, and a later part of either spelling replaces it.
//
// Loading validates every part it defines; the first problem throws
// VorantException naming the file, the part and the key. An unknown key is
// such a problem too (the error names the nearest known key).
class VORANT_HOST_API ConstraintsManager {
public:
    // A part of a newly loaded file that took the place of one loaded from
    // another file.
    struct Replacement {
        std::string part;
        std::string previousSource;
        std::string newSource;
    };
    using Replacements = std::vector<Replacement>;

    static ConstraintsManager& instance();

    // The property's text. Throws VorantException for an unknown part or key.
    const char* getDeviceStringProperty(const char* partName, const char* key);
    // The property as a 32-bit signed number (decimal, or hex with 0x).
    // Throws VorantException for an unknown part or key, or a value that is
    // not a 32-bit number.
    std::int32_t getDeviceLongProperty(const char* partName, const char* key);

    // Loads one part file, or every *.toml file of a directory in name
    // order (a directory without one is an error). Nothing of a file that
    // fails is added.
    Replacements loadFile(const std::string& path);
    Replacements loadDirectory(const std::string& path);
    // Loads TOML text; sourceName stands for the file in error messages.
    Replacements loadText(const std::string& text, const std::string& sourceName);

    // Adds (or replaces) a part without any validation, so tests can reach
    // values no part file may hold.
    void addPart(const std::string& partName, const std::map<std::string, std::string>& properties);
    void clear();

    bool hasPart(const std::string& partName) const;
    bool hasProperty(const std::string& partName, const std::string& key) const;
    std::vector<std::string> partNames() const;
    // Parts whose JEDEC ID (key JEDEC_ID, else IDCODE of a part that does
    // not use RES) equals hexId, ignoring letter case; sorted by name.
    std::vector<std::string> partsWithId(const std::string& hexId) const;
    // The file a part came from ("" for parts added in memory).
    std::string sourceOf(const std::string& partName) const;
    // The stored spelling of a part name given in any letter case; "" when
    // there is no such part.
    std::string canonicalName(const std::string& partName) const;

    // Checks one resolved part; throws VorantException "<source>: part
    // <name>: <key>: <reason>" for the first problem.
    static void validatePart(const std::string& sourceName, const std::string& partName,
                             const std::map<std::string, std::string>& properties);

    // The 41 keys a device reads at construction, in the order it reads them.
    static const std::vector<std::string>& deviceKeys();

private:
    struct Part {
        std::map<std::string, std::string> properties;
        std::string source;
    };
    const Part& part(const char* partName, const char* key) const;

    struct CaseInsensitiveLess {
        bool operator()(const std::string& a, const std::string& b) const;
    };

    mutable std::mutex mutex_;
    std::map<std::string, Part, CaseInsensitiveLess> parts_;
    std::map<std::string, std::map<std::string, std::string>> families_;
};
