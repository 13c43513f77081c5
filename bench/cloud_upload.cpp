// bench_cloud_upload [--rounds N] [--size MIB] [SERVICE]...: uploads of a large file by the driver
// and by libcurl alone, in turn, each in a process of its own before the same service; and the
// driver's peak memory for this file and one of 64 MiB.
#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <functional>

#include "cloud_bare_upload.h"
#include "service_process.h"

namespace {

constexpr long long kMiB = 1048576;
constexpr long long kSmallMiB = 64;
constexpr const char* kSource = "/dev/shm/cloud_upload_source";

struct Sample {
    double wall, cpu;
    long peak;  ///< KiB
};

/** A process that does this and tells what it took; it must be all that this one does meanwhile. */
Sample Measure(const std::string& what, const std::function<bool()>& work) {
    int tell[2];
    if (pipe(tell) != 0) {
        bench::Fail("pipe");
    }
    const pid_t child = fork();
    if (child == 0) {
        const auto start = std::chrono::steady_clock::now();
        const bool done = work();
        const std::chrono::duration<double> wall = std::chrono::steady_clock::now() - start;
        const Sample sample{wall.count(), 0, bench::PeakMemory()};
        _exit(done && write(tell[1], &sample, sizeof sample) == sizeof sample ? 0 : 1);
    }
    close(tell[1]);
    Sample sample{};
    const bool told = read(tell[0], &sample, sizeof sample) == sizeof sample;
    close(tell[0]);
    int status = 0;
    rusage usage{};
    wait4(child, &status, 0, &usage);
    if (!told || status != 0) {
        bench::Fail(what);
    }
    const auto seconds = [](const timeval& time) {
        return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
    };
    sample.cpu = seconds(usage.ru_utime) + seconds(usage.ru_stime);
    return sample;
}

bool UploadByDriver(const bench::Service& service, const bench::Access& access,
                    const std::string& name, int fd, long long size) {
    ZYROCloud::Cloud::InitCurlGlobal();
    const auto driver = bench::MakeDriver(service, access);
    const std::string uri = driver == nullptr ? "" : driver->GetServerID() + "/" + name;
    return driver != nullptr &&
           ZYROCloud::Cloud::UploadFile(driver.get(), uri, fd, size, nullptr, nullptr, nullptr);
}

using Upload = bool (*)(const bench::Service& service, const bench::Access& access,
                        const std::string& name, int fd, long long size);

Sample Send(Upload upload, const bench::Service& service, const bench::Access& access,
            long long mib) {
    static int number = 0;
    const std::string name = "file-" + std::to_string(++number) + ".bin";
    return Measure(name + " to " + service.name, [&] {
        // A profile tells the two apart by this.
        prctl(PR_SET_NAME, upload == UploadByDriver ? "driver" : "bare");
        const int fd = open(kSource, O_RDONLY | O_CLOEXEC);
        return upload(service, access, name, fd, mib * kMiB);
    });
}

double Median(std::vector<double> values) {
    std::sort(values.begin(), values.end());
    const size_t half = values.size() / 2;
    return values.size() % 2 == 1 ? values[half] : (values[half - 1] + values[half]) / 2;
}

double Median(const std::vector<Sample>& samples, const std::function<double(const Sample&)>& of) {
    std::vector<double> values;
    values.reserve(samples.size());
    for (const Sample& sample : samples) {
        values.push_back(of(sample));
    }
    return Median(values);
}

/** The median of the rounds' ratios, and the ratio of the best of each side: what other work on
 * the machine adds, it adds to neither of these two. */
void PrintRatio(const char* what, const std::vector<Sample>& ours, const std::vector<Sample>& bare,
                double Sample::*of) {
    std::vector<double> ratios;
    double best = 1e9;
    double best_bare = 1e9;
    for (size_t i = 0; i < ours.size(); ++i) {
        ratios.push_back(ours[i].*of / (bare[i].*of));
        best = std::min(best, ours[i].*of);
        best_bare = std::min(best_bare, bare[i].*of);
    }
    std::printf("  %s %.2f (of the best %.2f)", what, Median(ratios), best / best_bare);
}

void Compare(const bench::Service& service, int rounds, long long mib) {
    const bench::ServiceProcess process(service);
    const Sample small = Send(UploadByDriver, service, process.access, kSmallMiB);
    std::vector<Sample> ours;
    std::vector<Sample> bare;
    for (int i = 0; i < rounds; ++i) {
        // Whoever is first has a turn as the second, too.
        for (const bool driver : {i % 2 == 0, i % 2 != 0}) {
            (driver ? ours : bare)
                .push_back(Send(driver ? UploadByDriver : bench::UploadBare, service,
                                process.access, mib));
        }
    }
    const auto wall = [](const Sample& sample) { return sample.wall; };
    const auto cpu = [](const Sample& sample) { return sample.cpu; };
    std::printf(
        "%-9s %lld MiB, %d rounds: driver wall %.2f s cpu %.2f s, bare wall %.2f s cpu "
        "%.2f s\n         ",
        service.name, mib, rounds, Median(ours, wall), Median(ours, cpu), Median(bare, wall),
        Median(bare, cpu));
    PrintRatio("wall", ours, bare, &Sample::wall);
    PrintRatio("cpu", ours, bare, &Sample::cpu);
    const double peak =
        Median(ours, [](const Sample& sample) { return static_cast<double>(sample.peak); });
    std::printf("\n           peak memory %.1f MiB, of %lld MiB %.1f MiB: ratio %.2f\n",
                peak / 1024, kSmallMiB, static_cast<double>(small.peak) / 1024,
                peak / static_cast<double>(small.peak));
    std::fflush(stdout);
}

/** Every page of it is there: none is made while it is read. */
void MakeSource(long long mib) {
    const int fd = open(kSource, O_RDWR | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    if (fd < 0 || posix_fallocate(fd, 0, mib * kMiB) != 0) {
        bench::Fail(kSource);
    }
    close(fd);
}

}  // namespace

int main(int argc, char** argv) {
    int rounds = 7;
    long long mib = 1024;
    std::vector<std::string> names;
    for (int i = 1; i < argc; ++i) {
        const std::string word = argv[i];
        if (word == "--rounds" && i + 1 < argc) {
            rounds = static_cast<int>(std::max(1L, std::strtol(argv[++i], nullptr, 10)));
        } else if (word == "--size" && i + 1 < argc) {
            mib = std::max(1LL, std::strtoll(argv[++i], nullptr, 10));
        } else {
            names.push_back(word);
        }
    }
    MakeSource(std::max(mib, kSmallMiB));
    for (const bench::Service& service : bench::Services()) {
        const bool wanted =
            names.empty() || std::find(names.begin(), names.end(), service.name) != names.end();
        if (wanted && bench::HasBareUpload(service)) {
            Compare(service, rounds, mib);
        }
    }
    unlink(kSource);
    return 0;
}
