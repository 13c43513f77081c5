// One transfer through the engine and the driver for standard protocols, and nothing else, so that
// time and context switches of the process are those of the transfer; prints its peak memory, KiB:
//   bench_copy_once download URL FILE SIZE | upload FILE URL SIZE | copy URL URL SIZE
#include <fcntl.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <string>

#include "cloud/vfs/vfs_cloud.h"
#include "core/handle.h"

namespace {

using ZYROCloud::Cloud;
using ZYROVFS::UniqueFd;

/** Takes its URL as it is: no mount is needed to know where it leads. */
class Driver : public ZYROCloud::VFSCloud {
  public:
    Driver() : VFSCloud(0, Profile()) {}
    bool GetMetaDataByURI(const std::string& uri, Json::Value& meta, const std::string&) override {
        meta["url"] = uri;
        return true;
    }

  private:
    static Json::Value Profile() {
        Json::Value profile;
        profile["protocol"] = "dav";
        return profile;
    }
};

bool Run(const std::string& what, const std::string& from, const std::string& to, long long size) {
    Driver source;
    Driver target;
    if (what == "copy") {
        return Cloud::CopyFile(&source, &target, from, to, size, nullptr, nullptr, nullptr);
    }
    if (what == "upload") {
        const UniqueFd fd(open(from.c_str(), O_RDONLY | O_CLOEXEC));
        return Cloud::UploadFile(&target, to, fd.Get(), size, nullptr, nullptr, nullptr);
    }
    const UniqueFd fd(open(to.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600));
    return what == "download" &&
           Cloud::DownloadFile(&source, from, fd.Get(), size, nullptr, nullptr, nullptr);
}

/** KiB, of this program alone: what the kernel tells a parent counts the parent, too. */
long PeakMemory() {
    std::ifstream status("/proc/self/status");
    std::string word;
    long kib = 0;
    while (status >> word && word != "VmHWM:") {
    }
    status >> kib;
    return kib;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 5) {
        fprintf(stderr, "usage: %s download|upload|copy FROM TO SIZE\n", argv[0]);
        return 2;
    }
    Cloud::InitCurlGlobal();
    const bool done = Run(argv[1], argv[2], argv[3], atoll(argv[4]));
    Cloud::CleanupCurlGlobal();
    printf("%ld\n", PeakMemory());
    return done ? 0 : 1;
}
