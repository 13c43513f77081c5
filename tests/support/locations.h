/** Where this build finds its files. */
#ifndef ZYROVFS_TESTS_LOCATIONS_H
#define ZYROVFS_TESTS_LOCATIONS_H

#include <string>

/** The top of the tree. */
std::string SourceDir();

/** The top of the build tree. */
std::string BuildDir();

#endif
