/** Contents up and down, whole and in parts. */
#include "support/driver_suite.h"
#include "support/seams.h"

namespace driver_suite {
namespace {

constexpr long long kSizes[] = {0, 1, 22, 23, 24, 4096};
constexpr long long kLarge[] = {kChunk, kChunk + 1};

}  // namespace

TEST_P(DriverTransfer, FilesOfAllSizesGoUp) {
    for (const long long size : kSizes) {
        const std::string path = "/up-" + std::to_string(size);
        Source source(size);
        EXPECT_TRUE(Upload(source, path)) << size << seams::LogDump();
        EXPECT_EQ(SumOf(path), source.sum) << size;
    }
    EXPECT_EQ(Count(Op::kUpload), std::size(kSizes)) << sim.Journal().Text();
}

TEST_P(DriverTransfer, FilesOfAllSizesComeDown) {
    for (const long long size : kSizes) {
        const std::string path = "/target/down-" + std::to_string(size);
        amy.AddPattern(amy.Find("/target"), path.substr(8), static_cast<uint64_t>(size), 3);
        Show(path);
        EXPECT_TRUE(Download(path, size)) << size << seams::LogDump();
        EXPECT_EQ(received.Sum(), SumOf(path)) << size;
    }
}

TEST_P(DriverTransfer, OneChunkAndOneByteMoreGoUp) {
    for (const long long size : kLarge) {
        sim.Journal().Clear();
        const std::string path = "/up-" + std::to_string(size);
        Source source(size);
        EXPECT_TRUE(Upload(source, path)) << size << seams::LogDump();
        EXPECT_EQ(SumOf(path), source.sum) << size;
        EXPECT_EQ(User::done, static_cast<unsigned long long>(size));
        const bool direct =
            can.largest_direct == 0 || static_cast<unsigned long long>(size) <= can.largest_direct;
        EXPECT_EQ(Count(Op::kUpload), direct ? 1U : 0U) << sim.Journal().Text();
    }
}

TEST_P(DriverTransfer, OneChunkAndOneByteMoreComeDown) {
    for (const long long size : kLarge) {
        const std::string path = "/target/down-" + std::to_string(size);
        amy.AddPattern(amy.Find("/target"), path.substr(8), static_cast<uint64_t>(size), 3);
        Show(path);
        EXPECT_TRUE(Download(path, size)) << size << seams::LogDump();
        EXPECT_EQ(received.Sum(), SumOf(path)) << size;
    }
}

TEST_P(DriverTransfer, AnUploadIntoAFolderGoesThere) {
    EXPECT_TRUE(Upload("hello", "/docs/b.txt")) << seams::LogDump();
    EXPECT_EQ(TextOf("/docs/b.txt"), "hello");
    EXPECT_FALSE(amy.Exists("/b.txt"));
}

TEST_P(DriverTransfer, AnUploadOverAFile) {
    EXPECT_TRUE(Upload("hello", "/docs/a.txt")) << seams::LogDump();
    const bool replaces = can.upload_onto_file == Meeting::kReplaces;
    EXPECT_EQ(amy.List(amy.Find("/docs")).size(), replaces ? 1U : 2U);
    EXPECT_EQ(TextOf("/docs/a.txt"), replaces ? "hello" : kDigits);
}

TEST_P(DriverTransfer, PartsOfAFileComeDownAsAskedFor) {
    struct {
        long long from, len;
    } rows[] = {{0, 1}, {0, 4}, {2, 4}, {0, 9}, {9, 1}, {0, 10}, {5, 5}};
    const std::string address = rig->Address("/docs/a.txt");
    for (const auto& row : rows) {
        char buffer[16] = "";
        long long got = -1;
        EXPECT_TRUE(Cloud::DownloadFileToBuffer(cloud.get(), address, buffer, row.from, row.len,
                                                &got, nullptr, nullptr, nullptr))
            << row.from << " " << row.len << seams::LogDump();
        const std::string wanted = std::string(kDigits).substr(static_cast<size_t>(row.from),
                                                               static_cast<size_t>(row.len));
        // One byte more is asked for than is wanted, and comes where there is one.
        EXPECT_GE(got, row.len);
        EXPECT_LE(got, row.len + 1);
        EXPECT_EQ(std::string(buffer, static_cast<size_t>(row.len)), wanted) << row.from;
    }
}

TEST_P(DriverTransfer, APartBehindTheEndIsAFailure) {
    char buffer[16] = "";
    long long got = -1;
    EXPECT_FALSE(Cloud::DownloadFileToBuffer(cloud.get(), rig->Address("/docs/a.txt"), buffer, 11,
                                             2, &got, nullptr, nullptr, nullptr));
    EXPECT_EQ(got, -1);
}

TEST_P(DriverTransfer, SizesBeyondTheServicesLimitAreRefusedBeforehand) {
    EXPECT_TRUE(cloud->CanFileUpload(0));
    EXPECT_TRUE(cloud->CanFileUpload(can.largest_file));
    EXPECT_TRUE(cloud->CanFileUpload(~0ULL)) << "not known";
    EXPECT_FALSE(cloud->CanFileUpload(can.refused_file));
    EXPECT_EQ(Code(), VFS_ERR_FILE_TOO_LARGE);
    EXPECT_FALSE(cloud->CanFileUpload(~0ULL - 1));
    EXPECT_TRUE(sim.Journal().All().empty());
}

}  // namespace driver_suite
