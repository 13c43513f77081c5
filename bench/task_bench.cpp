// The task registry's questions against a bare read of the same queue: every line split, and its
// process looked at, which whoever asks a queue has to do. Once with all other jobs ended, as a
// queue is before it is cleaned, and once with all of them living.
#include <benchmark/benchmark.h>
#include <unistd.h>
#include <zosplatform/process.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <string>

#include "zyrovfs/task.h"

namespace {

constexpr const char* kFolder = "/var/tmp/user/4001/zyrovfs/task/copy";
constexpr const char* kQueue = "/var/tmp/user/4001/zyrovfs/task/copy/copy";
constexpr unsigned kNoLimit = 1000000;
constexpr int kLiving = 1;       // the private host's first process
constexpr int kEnded = 2000000;  // and upwards: numbers that no process there has

/** A queue of `count` lines, of which the asking job's is the last. */
void Fill(int64_t count, bool living) {
    setenv("ZYROVFS_UID", "4001", 1);
    std::filesystem::create_directories(kFolder);
    std::ofstream queue(kQueue);
    for (int64_t i = 1; i < count; ++i) {
        queue << "copy-" << i << '\t' << (living ? kLiving : kEnded + i) << '\n';
    }
    queue << "mine\t" << getpid() << '\n';
}

void Runnable(benchmark::State& state, bool living) {
    Fill(state.range(0), living);
    ZYROVFS::TaskMgr tasks(kNoLimit);
    const int64_t expected = living ? state.range(0) : 1;
    for (auto _ : state) {
        if (tasks.IsRunnable("copy", "mine", getpid(), nullptr, nullptr) != expected) {
            state.SkipWithError("wrong place");
        }
    }
}

void Addable(benchmark::State& state, bool living) {
    Fill(state.range(0), living);
    ZYROVFS::TaskMgr tasks(kNoLimit);
    for (auto _ : state) {
        if (!tasks.IsAddable("copy", getpid())) {
            state.SkipWithError("no room");
        }
    }
}

/** Splits every line; with `look` asks for its process, too. Number of lines of living others. */
int64_t ReadBare(bool look) {
    FILE* file = fopen(kQueue, "re");
    char* line = nullptr;
    size_t capacity = 0;
    int64_t found = 0;
    while (getline(&line, &capacity, file) > 0) {
        char* rest = nullptr;
        const char* id = strtok_r(line, "\t\n", &rest);
        const char* process = strtok_r(nullptr, "\t\n", &rest);
        benchmark::DoNotOptimize(id);
        const int pid = static_cast<int>(strtol(process, nullptr, 10));
        found += look && pid != getpid() && YLIBCProcAlive(pid) != 0 ? 1 : 0;
    }
    free(line);
    fclose(file);
    return found;
}

void Bare(benchmark::State& state, bool living) {
    Fill(state.range(0), living);
    for (auto _ : state) {
        if (ReadBare(true) != (living ? state.range(0) - 1 : 0)) {
            state.SkipWithError("wrong count");
        }
    }
}

void RunnableEnded(benchmark::State& state) {
    Runnable(state, false);
}
void RunnableEnded_bare(benchmark::State& state) {
    Bare(state, false);
}
void RunnableLiving(benchmark::State& state) {
    Runnable(state, true);
}
void RunnableLiving_bare(benchmark::State& state) {
    Bare(state, true);
}
void AddableEnded(benchmark::State& state) {
    Addable(state, false);
}
void AddableEnded_bare(benchmark::State& state) {
    Bare(state, false);
}
void AddableLiving(benchmark::State& state) {
    Addable(state, true);
}
void AddableLiving_bare(benchmark::State& state) {
    Bare(state, true);
}

/** What of a question is the file alone. */
void SplitAlone(benchmark::State& state) {
    Fill(state.range(0), false);
    for (auto _ : state) {
        benchmark::DoNotOptimize(ReadBare(false));
    }
}

}  // namespace

#define QUEUE_BENCHMARK(name) BENCHMARK(name)->Arg(10)->Arg(100)->Arg(1000)
QUEUE_BENCHMARK(RunnableEnded);
QUEUE_BENCHMARK(RunnableEnded_bare);
QUEUE_BENCHMARK(RunnableLiving);
QUEUE_BENCHMARK(RunnableLiving_bare);
QUEUE_BENCHMARK(AddableEnded);
QUEUE_BENCHMARK(AddableEnded_bare);
QUEUE_BENCHMARK(AddableLiving);
QUEUE_BENCHMARK(AddableLiving_bare);
QUEUE_BENCHMARK(SplitAlone);
