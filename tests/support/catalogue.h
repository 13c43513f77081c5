/** A catalogue of known content in the place of the machine's. */
#ifndef ZYROVFS_TESTS_CATALOGUE_H
#define ZYROVFS_TESTS_CATALOGUE_H

#include <filesystem>
#include <fstream>
#include <string>

#include "core/paths.h"

namespace catalogue {

inline void Clear() {
    std::filesystem::remove_all(ZYROVFS::paths::kCatalogueDir);
    std::filesystem::create_directories(ZYROVFS::paths::kCatalogueDir);
}

inline void Add(const std::string& protocol, const std::string& name, const std::string& actions) {
    std::ofstream(std::string(ZYROVFS::paths::kCatalogueDir) + "/" + protocol + ".mount")
        << "[Mount]\nType=" << protocol << "\nProtocol=" << protocol << "\nName=" << name
        << "\nActions=" << actions << "\n";
}

}  // namespace catalogue

#endif
