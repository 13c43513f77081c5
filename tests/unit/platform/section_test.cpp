#include <sys/stat.h>
#include <zosplatform/error.h>
#include <zosplatform/file.h>

#include <memory>

#include "support/scratch.h"

namespace {

struct FreeHash {
    void operator()(PYLIBCSZHASH hash) const { YLIBCSzHashFree(hash); }
};

class Section : public scratch::ScratchTest {
  protected:
    int Read(const std::string& path) {
        PYLIBCSZHASH hash = hash_.release();
        const int keys = YLIBCFileGetSection(path.c_str(), "Mount", &hash);
        hash_.reset(hash);
        return keys;
    }
    int ReadText(const std::string& text) { return Read(Put("file", text)); }
    std::string Value(const char* key) const {
        const char* value = YLIBCSzHashGetValue(hash_.get(), key);
        return value == nullptr ? "(absent)" : value;
    }

    std::unique_ptr<_tag_YLIBCSZHASH_, FreeHash> hash_{YLIBCSzHashAlloc(1024)};
};

TEST_F(Section, KeysOfTheSectionAreRead) {
    EXPECT_EQ(ReadText("[Other]\nName=no\n[Mount]\nName=FTP\nDefaultPort=21\n[More]\nApi=no\n"), 2);
    EXPECT_EQ(Value("Name"), "FTP");
    EXPECT_EQ(Value("DefaultPort"), "21");
    EXPECT_EQ(Value("Api"), "(absent)");
}

TEST_F(Section, BlanksAndCommentsAreDropped) {
    EXPECT_EQ(ReadText("  [Mount] \r\n# Name=no\n ;Name=no\n\n \t Name \t= File server \t\r\n"), 1);
    EXPECT_EQ(Value("Name"), "File server");
}

TEST_F(Section, ValuesKeepHashesEqualSignsAndInnerBlanks) {
    EXPECT_EQ(ReadText("[Mount]\nExec=a  b #c;d=e\n"), 1);
    EXPECT_EQ(Value("Exec"), "a  b #c;d=e");
}

TEST_F(Section, EmptyValueIsAValue) {
    EXPECT_EQ(ReadText("[Mount]\nName=\n"), 1);
    EXPECT_EQ(Value("Name"), "");
}

TEST_F(Section, LinesWithoutKeyOrEqualSignAreDropped) {
    EXPECT_EQ(ReadText("[Mount]\nName\n=value\n ] \n[half\n"), 0);
}

TEST_F(Section, LastOfTwoEqualKeysCounts) {
    EXPECT_EQ(ReadText("[Mount]\nName=a\n[X]\n[Mount]\nName=b\n"), 1);
    EXPECT_EQ(Value("Name"), "b");
}

TEST_F(Section, KeysAndSectionsKeepTheirCase) {
    EXPECT_EQ(ReadText("[mount]\nName=a\n[Mount]\nNAME=b\n"), 1);
    EXPECT_EQ(Value("Name"), "(absent)");
    EXPECT_EQ(Value("NAME"), "b");
}

TEST_F(Section, LastLineNeedsNoNewline) {
    EXPECT_EQ(ReadText("[Mount]\nName=a"), 1);
    EXPECT_EQ(Value("Name"), "a");
}

TEST_F(Section, FileWithoutTheSectionHasNoKeys) {
    EXPECT_EQ(ReadText("Name=a\n"), 0);
    EXPECT_EQ(ReadText(""), 0);
    EXPECT_EQ(ReadText("[Mount]"), 0);
}

TEST_F(Section, HashIsEmptiedFirst) {
    ReadText("[Mount]\nName=a\n");
    EXPECT_EQ(ReadText("[Mount]\nApi=b\n"), 1);
    EXPECT_EQ(Value("Name"), "(absent)");
    EXPECT_EQ(Read(Path("nothing")), -1);
    EXPECT_EQ(Value("Api"), "(absent)");
}

TEST_F(Section, BinaryBytesDoNoHarm) {
    std::string text(
        "\x7f"
        "ELF\0\0[Mount]\0\n[Mount]\nName=a\0b\n\xff\xfe=x\n",
        38);
    EXPECT_EQ(ReadText(text), 2);
    EXPECT_EQ(Value("Name"), "a") << "texts end at a NUL";
    EXPECT_EQ(Value("\xff\xfe"), "x");
}

TEST_F(Section, LinesOfAMebibyte) {
    const std::string large(1 << 20, 'x');
    EXPECT_EQ(ReadText("[Mount]\nName=" + large + "\n" + large + "=y\n"), 2);
    EXPECT_EQ(Value("Name"), large);
    EXPECT_EQ(Value(large.c_str()), "y");
}

TEST_F(Section, WhatIsNoFileFails) {
    EXPECT_EQ(Read(Path("nothing")), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NOT_FOUND);
    EXPECT_STREQ(YLIBCErrorGetFile(), "section.cpp");
    EXPECT_EQ(Read(directory_), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_OPEN_FAILED);
    ASSERT_EQ(mkfifo(Path("pipe").c_str(), 0600), 0);
    EXPECT_EQ(Read(Path("pipe")), -1);
}

TEST_F(Section, NullArgumentsAreRefused) {
    PYLIBCSZHASH none = nullptr;
    EXPECT_EQ(YLIBCFileGetSection("/etc/hosts", "Mount", &none), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
    EXPECT_EQ(YLIBCFileGetSection("/etc/hosts", "Mount", nullptr), -1);
    PYLIBCSZHASH hash = hash_.get();
    EXPECT_EQ(YLIBCFileGetSection(nullptr, "Mount", &hash), -1);
    EXPECT_EQ(YLIBCFileGetSection("/etc/hosts", nullptr, &hash), -1);
}

}  // namespace
