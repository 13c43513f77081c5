// Archives as they go out, read again by a foreign program.
#include "zip.h"

#include <gmock/gmock.h>

#include <unistd.h>

#include <fstream>

#include "support/machine.h"

namespace {

using web::Zip;
using web::ZipEntry;
using web::ZipSize;

constexpr uint64_t kGiB = 1ULL << 30;

/** Zeros as holes, so that an archive beyond 4 GiB costs no disk. */
class SparseFile {
  public:
    explicit SparseFile(const std::string& path) : file_(path, std::ios::binary) {}
    ~SparseFile() {
        file_.close();
        EXPECT_EQ(truncate(path_.c_str(), static_cast<off_t>(size_)), 0);
    }
    SparseFile(const SparseFile&) = delete;
    SparseFile& operator=(const SparseFile&) = delete;

    Zip::Sink Sink() {
        return [this](const char* data, size_t size) {
            const bool hole =
                size >= 65536 && std::all_of(data, data + size, [](char c) { return c == '\0'; });
            hole ? file_.seekp(static_cast<std::streamoff>(size), std::ios::cur)
                 : file_.write(data, static_cast<std::streamsize>(size));
            size_ += size;
            return static_cast<bool>(file_);
        };
    }
    uint64_t Size() const { return size_; }

  private:
    std::string path_ = "/tmp/archive.zip";
    std::ofstream file_;
    uint64_t size_ = 0;
};

/** What Python says of /tmp/archive.zip: one line for each entry. */
std::string Read(const std::string& more = "") {
    std::ofstream("/tmp/read.py") << "import zipfile\n"
                                     "z = zipfile.ZipFile('/tmp/archive.zip')\n"
                                     "for i in z.infolist():\n"
                                     "    print(i.filename, i.file_size, i.header_offset, "
                                     "i.is_dir(), oct(i.external_attr >> 16))\n"
                                  << more;
    return machine::Must("python3 /tmp/read.py");
}

std::string Write(const std::vector<std::pair<ZipEntry, std::string>>& contents) {
    std::string archive;
    Zip zip([&](const char* data, size_t size) {
        archive.append(data, size);
        return true;
    });
    std::vector<ZipEntry> entries;
    for (const auto& [entry, bytes] : contents) {
        entries.push_back(entry);
        EXPECT_TRUE(zip.Begin(entry) && zip.Write(bytes.data(), bytes.size()) && zip.End());
    }
    EXPECT_TRUE(zip.Finish());
    EXPECT_EQ(archive.size(), ZipSize(entries));
    std::ofstream("/tmp/archive.zip", std::ios::binary) << archive;
    return archive;
}

TEST(WebZip, FilesAndFoldersAreReadAgainByAForeignProgram) {
    Write({{{"folder/", 0, 1600000000}, ""},
           {{"folder/grüße 😀.txt", 9, 1600000000}, "greetings"},
           {{"nothing", 0, 0}, ""}});
    EXPECT_EQ(Read("assert z.testzip() is None\nassert z.read('folder/grüße 😀.txt') == b'greetings'"
                   "\nassert z.getinfo('folder/grüße 😀.txt').date_time[0] == 2020"),
              "folder/ 0 0 True 0o40755\n"
              "folder/grüße 😀.txt 9 46 False 0o100644\n"
              "nothing 0 133 False 0o100644\n");
    EXPECT_EQ(machine::Run("unzip -t /tmp/archive.zip").status, 0);
}

TEST(WebZip, AnEmptyArchiveIsAnArchive) {
    EXPECT_EQ(Write({}).size(), 22U);
    EXPECT_EQ(Read(), "");
}

TEST(WebZip, NamesLeadNowhereElse) {
    Write({{{"..\\..\\evil.txt", 1, 0}, "x"}});
    EXPECT_THAT(Read(), testing::StartsWith(".._.._evil.txt 1 0"));
}

TEST(WebZip, AFileAndAnArchiveBeyondFourGibibytesAreWhole) {
    const std::vector<ZipEntry> entries = {
        {"large", 5 * kGiB, 0}, {"behind", 6, 0}, {"folder/", 0, 0}};
    uint64_t size = 0;
    {
        SparseFile file("/tmp/archive.zip");
        Zip zip(file.Sink());
        const std::string piece(1 << 20, '\0');
        ASSERT_TRUE(zip.Begin(entries[0]));
        for (uint64_t at = 0; at < entries[0].size; at += piece.size()) {
            ASSERT_TRUE(zip.Write(piece.data(), piece.size()));
        }
        ASSERT_TRUE(zip.End() && zip.Begin(entries[1]) && zip.Write("behind", 6) && zip.End() &&
                    zip.Begin(entries[2]) && zip.End() && zip.Finish());
        size = file.Size();
    }
    EXPECT_EQ(size, ZipSize(entries));
    EXPECT_THAT(Read("assert z.read('behind') == b'behind'\nassert z.testzip() is None\n"),
                testing::HasSubstr("large 5368709120 0 False"));
    EXPECT_EQ(machine::Run("unzip -l /tmp/archive.zip | grep -q 5368709120").status, 0);
}

TEST(WebZip, EachOffsetAroundFourGibibytesIsTold) {
    for (const uint64_t begin : {4 * kGiB - 1, 4 * kGiB - 2, 4 * kGiB - 60, 4 * kGiB}) {
        std::string archive;
        Zip zip(
            [&](const char* data, size_t size) {
                archive.append(data, size);
                return true;
            },
            begin);
        const std::vector<ZipEntry> entries = {{"one", 3, 0}, {"two", 3, 0}};
        for (const ZipEntry& entry : entries) {
            ASSERT_TRUE(zip.Begin(entry) && zip.Write("abc", 3) && zip.End());
        }
        ASSERT_TRUE(zip.Finish());
        EXPECT_EQ(archive.size(), ZipSize(entries, begin)) << begin;
        {
            std::ofstream file("/tmp/archive.zip", std::ios::binary);
            file.seekp(static_cast<std::streamoff>(begin));
            file << archive;
        }
        EXPECT_EQ(Read("assert z.read('two') == b'abc'\nassert z.testzip() is None\n"),
                  "one 3 " + std::to_string(begin) + " False 0o100644\ntwo 3 " +
                      std::to_string(begin + 61) + " False 0o100644\n");
    }
}

TEST(WebZip, MoreEntriesThanSixteenBitsCount) {
    std::vector<std::pair<ZipEntry, std::string>> contents;
    for (int i = 0; i < 65536; ++i) {
        contents.push_back({{std::to_string(i), 0, 0}, ""});
    }
    Write(contents);
    Read("assert len(z.infolist()) == 65536\n");
}

TEST(WebZip, AContentOfAnotherSizeBreaksTheArchiveForGood) {
    std::string archive;
    const auto sink = [&](const char* data, size_t size) {
        archive.append(data, size);
        return true;
    };
    Zip shorter(sink);
    EXPECT_TRUE(shorter.Begin({"a", 3, 0}) && shorter.Write("ab", 2));
    EXPECT_FALSE(shorter.End());
    EXPECT_FALSE(shorter.Finish());
    Zip longer(sink);
    EXPECT_TRUE(longer.Begin({"a", 3, 0}));
    EXPECT_FALSE(longer.Write("abcd", 4));
    EXPECT_FALSE(longer.Write("abc", 3));
    EXPECT_FALSE(longer.End());
    EXPECT_FALSE(longer.Finish());
    EXPECT_THAT(archive, testing::Not(testing::HasSubstr("PK\x05\x06")));
}

TEST(WebZip, ASinkThatTakesNoMoreEndsIt) {
    size_t room = 40;
    Zip zip([&](const char*, size_t size) {
        const bool fits = size <= room;
        room -= fits ? size : 0;
        return fits;
    });
    EXPECT_TRUE(zip.Begin({"a", 30, 0}) == false ||
                zip.Write(std::string(30, 'x').data(), 30) == false);
    EXPECT_FALSE(zip.End());
    EXPECT_FALSE(zip.Finish());
}

}  // namespace
