#include "support/locations.h"

std::string SourceDir() {
    return SOURCE_DIR;
}

std::string BuildDir() {
    return BUILD_DIR;
}
