/** What the tests of the catalogue's operations share. */
#ifndef ZYROVFS_TESTS_CATALOGUE_TEST_H
#define ZYROVFS_TESTS_CATALOGUE_TEST_H

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <functional>
#include <string>

#include "support/catalogue.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "zyrovfs/error.h"
#include "zyrovfs/protocol.h"

namespace catalogue {

inline std::string Path(const std::string& file) {
    return std::string(ZYROVFS::paths::kCatalogueDir) + "/" + file;
}

/** A file of the catalogue with this text. */
inline void Put(const std::string& file, const std::string& text) {
    std::ofstream(Path(file), std::ios::binary) << text;
}

/** Runs a body with the effective identity of an ordinary user. */
inline void AsUser(const std::function<void()>& body) {
    ASSERT_EQ(setresuid(-1, profiles::kUser, 0), 0);
    body();
    ASSERT_EQ(setresuid(-1, 0, -1), 0);
}

/** An empty catalogue. */
class CatalogueTest : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        seams::Reset();
        Clear();
    }
    void TearDown() override { Clear(); }
};

/** Names of file content that is no .mount file, each with the content. */
inline std::vector<std::pair<std::string, std::string>> DamagedTexts() {
    std::string every_byte;
    for (int i = 0; i < 256; ++i) {
        every_byte += static_cast<char>(i);
    }
    return {
        {"empty", ""},
        {"every byte", every_byte},
        {"a mebibyte of one line", std::string(1 << 20, 'x')},
        {"a mebibyte of NUL", std::string(1 << 20, '\0')},
        {"another section", "[Other]\nProtocol=x\nName=y\n"},
        {"no section", "Protocol=x\nName=y\n"},
        {"empty section", "[Mount]\n"},
        {"truncated section", "[Mou"},
    };
}

}  // namespace catalogue

#endif
