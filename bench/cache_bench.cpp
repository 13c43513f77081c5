// A backend's cache of a million entries: looking paths up against a bare hash table of the same
// paths, and eight threads that list, look up and remove against one, beside what the lock alone
// costs eight threads.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <fstream>
#include <mutex>
#include <random>
#include <string>
#include <unordered_map>
#include <vector>

#include "zyrovfs/zyrocloud.h"

namespace {

constexpr int kFolders = 1000;
constexpr int kFiles = 1000;
/** What one thread lists, looks up and removes before it begins again. */
constexpr int kListing = 100;
/** How often a round of that takes the lock: around the listing, twice per item in it, once per
 * item to look it up and once to remove it. */
constexpr int kLocksOfRound = 4 * kListing + 2;

std::string Folder(int number) {
    return "/Documents/Projects/folder " + std::to_string(number);
}

std::string File(int number) {
    return "report of the year " + std::to_string(number) + ".pdf";
}

/** A record with all that the services' listings fill in. */
GFileInfo* NewInfo(const std::string& name) {
    GFileInfo* info = g_file_info_new();
    g_file_info_set_attribute_string(info, "id::file", "files/934857239847");
    g_file_info_set_file_type(info, G_FILE_TYPE_REGULAR);
    g_file_info_set_name(info, name.c_str());
    g_file_info_set_display_name(info, name.c_str());
    g_file_info_set_size(info, 123456);
    for (const char* time : {"time::modified", "time::access", "time::changed", "time::created"}) {
        g_file_info_set_attribute_uint64(info, time, 1700000000);
        g_file_info_set_attribute_uint32(info, (std::string(time) + "-usec").c_str(), 0);
    }
    for (const char* right : {"read", "write", "delete", "execute", "trash", "rename"}) {
        g_file_info_set_attribute_boolean(info, (std::string("access::can-") + right).c_str(),
                                          TRUE);
    }
    return info;
}

long long ResidentBytes() {
    long long all = 0;
    long long resident = 0;
    std::ifstream("/proc/self/statm") >> all >> resident;
    return resident * 4096;
}

std::vector<std::string> MakePaths() {
    std::vector<std::string> paths;
    for (int folder = 0; folder < kFolders; ++folder) {
        for (int file = 0; file < kFiles; ++file) {
            paths.push_back(Folder(folder) + "/" + File(file));
        }
    }
    return paths;
}

/** Every path of the million, folder after folder. */
const std::vector<std::string>& Paths() {
    static const std::vector<std::string> paths = MakePaths();
    return paths;
}

/** What is looked up: in another order than what was stored, or memory would be read in a row. */
const std::vector<std::string>& Shuffled() {
    static const std::vector<std::string> shuffled = [] {
        std::vector<std::string> paths = Paths();
        std::shuffle(paths.begin(), paths.end(), std::mt19937(1));
        return paths;
    }();
    return shuffled;
}

/** One cache for all, since the setting is the process's: it follows what the last Init said. */
class FilledCache {
  public:
    FilledCache() {
        Paths();
        const long long before = ResidentBytes();
        ZYROCloud_Cache_Init(&cache_);
        for (const std::string& path : Paths()) {
            const std::string folder = path.substr(0, path.rfind('/'));
            GFileInfo* info = NewInfo(path.substr(folder.size() + 1));
            ZYROCloud_Cache_Entry_Add(cache_, folder.c_str(), info);
            ZYROCloud_Cache_List_Add(cache_, folder.c_str(), false, info);
            g_object_unref(info);
        }
        bytes_per_item_ =
            static_cast<double>(ResidentBytes() - before) / static_cast<double>(Paths().size());
    }

    ZYROCloud_Cache* Get(bool caseless) {
        (caseless ? ZYROCloud_Cache_CassLess_Init : ZYROCloud_Cache_Init)(nullptr);
        ZYROCloud_Cache_Entry_None_Get(cache_, "/");  // the maps are sorted anew here
        return cache_;
    }
    double BytesPerItem() const { return bytes_per_item_; }

  private:
    ZYROCloud_Cache* cache_ = nullptr;
    double bytes_per_item_ = 0;
};

FilledCache& Filled() {
    static FilledCache filled;
    return filled;
}

/** Runs `look(path)`, which answers whether it is as it should be, over path after path. */
template <typename Look>
void LookUp(benchmark::State& state, Look look) {
    size_t next = 0;
    for (auto _ : state) {
        if (!look(Shuffled()[next])) {
            state.SkipWithError("not found");
        }
        next = next + 1 == Shuffled().size() ? 0 : next + 1;
    }
}

void EntryGet(benchmark::State& state, bool caseless) {
    ZYROCloud_Cache* cache = Filled().Get(caseless);
    LookUp(state, [&](const std::string& path) {
        GFileInfo* info = nullptr;
        return ZYROCloud_Cache_Entry_Get(cache, path.c_str(), &info) == 1;
    });
    state.counters["bytes_per_item"] = Filled().BytesPerItem();
}

void EntryNoneGet(benchmark::State& state, bool caseless) {
    ZYROCloud_Cache* cache = Filled().Get(caseless);
    LookUp(state, [&](const std::string& path) {
        return ZYROCloud_Cache_Entry_None_Get(cache, path.c_str()) == 0;
    });
}

/** With a million marks, of which each is asked for once and, being old by then, removed. */
void EntryNoneGetOfMarks(benchmark::State& state) {
    ZYROCloud_Cache* cache = nullptr;
    ZYROCloud_Cache_Init(&cache);
    for (const std::string& path : Paths()) {
        ZYROCloud_Cache_Entry_Remove(cache, path.c_str(), true);
    }
    g_usleep(1100000);
    LookUp(state, [&](const std::string& path) {
        return ZYROCloud_Cache_Entry_None_Get(cache, path.c_str()) == 0;
    });
    ZYROCloud_Cache_Destroy(&cache);
}

void EntryGet_bare(benchmark::State& state) {
    std::unordered_map<std::string, int> table;
    for (const std::string& path : Paths()) {
        table.emplace(path, 1);
    }
    LookUp(state, [&](const std::string& path) { return table.find(path.c_str()) != table.end(); });
}

constexpr int kLookUps = 1000000;

BENCHMARK_CAPTURE(EntryGet, bytes, false)->Iterations(kLookUps);
BENCHMARK_CAPTURE(EntryGet, caseless, true)->Iterations(kLookUps);
BENCHMARK(EntryGet_bare)->Iterations(kLookUps);
BENCHMARK_CAPTURE(EntryNoneGet, bytes, false)->Iterations(kLookUps);
BENCHMARK_CAPTURE(EntryNoneGet, caseless, true)->Iterations(kLookUps);
BENCHMARK(EntryNoneGetOfMarks)->Iterations(kLookUps);

/** What all threads of one benchmark share. */
struct Shared {
    Shared() { ZYROCloud_Cache_Init(&cache); }
    ZYROCloud_Cache* cache = nullptr;
    GRecMutex mutex{};
};

Shared& TheShared() {
    static Shared shared;
    return shared;
}

/** A folder of 100 items is listed, each item looked up, and each removed. */
void ListLookUpRemove(benchmark::State& state) {
    ZYROCloud_Cache* cache = TheShared().cache;
    const std::string folder = Folder(state.thread_index());
    std::vector<GFileInfo*> infos;
    std::vector<std::string> paths;
    for (int file = 0; file < kListing; ++file) {
        infos.push_back(NewInfo(File(file)));
        paths.push_back(folder + "/" + File(file));
    }
    for (auto _ : state) {
        ZYROCloud_Cache_List_Remove(cache, folder.c_str());
        for (GFileInfo* info : infos) {
            ZYROCloud_Cache_Entry_Add(cache, folder.c_str(), info);
            ZYROCloud_Cache_List_Add(cache, folder.c_str(), false, info);
        }
        for (const std::string& path : paths) {
            GFileInfo* found = nullptr;
            if (ZYROCloud_Cache_Entry_Get(cache, path.c_str(), &found) != 1) {
                state.SkipWithError("not found");
            }
        }
        for (const std::string& path : paths) {
            ZYROCloud_Cache_Entry_Remove(cache, path.c_str(), false);
        }
    }
    for (GFileInfo* info : infos) {
        g_object_unref(info);
    }
}

/** As often as a round above takes the lock, and nothing else. */
void LockAlone(benchmark::State& state) {
    GRecMutex* mutex = &TheShared().mutex;
    for (auto _ : state) {
        for (int lock = 0; lock < kLocksOfRound; ++lock) {
            g_rec_mutex_lock(mutex);
            g_rec_mutex_unlock(mutex);
        }
    }
}

BENCHMARK(ListLookUpRemove)->Threads(1)->UseRealTime();
BENCHMARK(ListLookUpRemove)->Threads(8)->UseRealTime();
BENCHMARK(LockAlone)->Threads(1)->UseRealTime();
BENCHMARK(LockAlone)->Threads(8)->UseRealTime();

}  // namespace
