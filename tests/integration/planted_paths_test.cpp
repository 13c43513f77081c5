// Every path that the library touches for a user, found by tracing its commands, and in the place
// of each part of each what a second user of the machine can put there first: links, FIFOs, sparse
// files, folders. The command ends in good time, root follows no link, and nothing of root's
// appears where the stranger put a folder.
#include <gmock/gmock.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/sysmacros.h>
#include <sys/wait.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <map>
#include <regex>
#include <thread>
#include <vector>

#include "support/machine.h"
#include "support/stranger.h"
#include "support/traced_paths.h"

namespace {

namespace fs = std::filesystem;
using machine::Must;
using std::chrono::milliseconds;
using std::chrono::steady_clock;
using testing::IsSupersetOf;

constexpr unsigned kAmy = 4001;
constexpr auto kPatience = std::chrono::seconds(60);
constexpr auto kQuick = milliseconds(1500);
constexpr long kMostMemory = 300L << 10;  // KiB
const std::string kTool = BuildDir() + "/tools/zyrovfs/zyrovfs ";
const std::string kFuseTree = "/var/tmp/user/4001/gvfs";
const std::string kTraces = "/run/traces/";
const std::string kSnapshot = "/run/snapshot";

/** What the library keeps; the state of a machine that is in use. */
const std::vector<std::string> kTrees = {"/usr/zyro/etc", "/var/tmp/zyrovfs", "/var/tmp/user",
                                         "/var/tmp/zos",  "/tmp/zyrovfs",     "/tmp/userlock",
                                         "/tmp/grouplock"};

struct Operation {
    std::string name;
    std::string arguments;
};

const std::string kRemote = " --account remo --password-file /run/password --uid 4001";
const std::string kFtp = "ftp://remo@127.0.0.1:2121";
const std::string kDavs = "davs://remo@localhost:8443";
const std::vector<Operation> kOperations = {
    {"profile-add",
     "profile add --alias N --protocol ftp --hostname 127.0.0.1 --port 2121" + kRemote},
    {"profile-set", "profile set " + kFtp + " --alias M --uid 4001"},
    {"connection-set", "connection set " + kDavs + " --alias K --uid 4001"},
    {"pin", "connection add --alias D --protocol davs --hostname localhost --port 8443 --accept" +
                kRemote},
    {"host-key",
     "connection add --alias S --protocol sftp --hostname 127.0.0.1 --port 2222 --accept" +
         kRemote},
    {"copy", "cp " + kFtp + "/hello.txt /home/amy/hello.txt --uid 4001"},
    {"task-add", "task add copy a --uid 4001 --pid $$"},
    {"task-list", "task list --uid 4001"},
    {"task-clean", "task clean copy --uid 4001"},
    {"policy-set", "policy set --type all"},
    {"policy-list", "policy list --limit 5"},
    {"policy-groups", "policy list --groups --limit 5"},
    {"policy-domain", "policy list --auth domain --limit 5"},
    {"user-clean", "user clean --uid 4001"},
};

/** The user's daemons, and what they have mounted. */
void EndUser() {
    for (const auto& entry : fs::directory_iterator("/proc")) {
        struct stat info {};
        const std::string name = entry.path().filename();
        if (isdigit(static_cast<unsigned char>(name[0])) != 0 &&
            stat(entry.path().c_str(), &info) == 0 && info.st_uid == kAmy) {
            kill(std::stoi(name), SIGKILL);
        }
    }
    umount2(kFuseTree.c_str(), MNT_DETACH);
}

bool IsTracing() {
    const fs::directory_iterator processes("/proc");
    return std::any_of(begin(processes), end(processes), [](const auto& entry) {
        return machine::Read(entry.path() / "comm") == "strace\n";
    });
}

void TakeSnapshot() {
    Must("rm -rf " + kSnapshot + " && mkdir -p " + kSnapshot);
    for (const std::string& tree : kTrees) {
        fs::create_directories(fs::path(kSnapshot + tree).parent_path());
        Must("[ ! -e " + tree + " ] || cp -a " + tree + " " + kSnapshot + tree);
    }
}

/** What strangers left is moved aside in folders that stay. */
void Restore() {
    EndUser();
    for (const std::string& tree : kTrees) {
        Must("rm -rf " + tree + "; [ ! -e " + kSnapshot + tree + " ] || cp -a " + kSnapshot + tree +
             " " + tree);
    }
    Must("rm -rf /tmp/.foreign.* /var/tmp/.foreign.* /tmp/domain_*");
}

struct Ending {
    bool in_time;
    milliseconds took;
    long memory;  ///< KiB, of the largest of its processes
};

/** A command of root's, in a session of its own; one that does not end is killed. */
Ending Perform(const std::string& command) {
    const auto begin = steady_clock::now();
    const pid_t pid = fork();
    if (pid == 0) {
        setsid();
        execl("/bin/sh", "sh", "-c", (command + " >/run/output 2>&1 </dev/null").c_str(), nullptr);
        _exit(127);
    }
    int status = 0;
    rusage usage{};
    bool ended = false;
    while (!(ended = wait4(pid, &status, WNOHANG, &usage) == pid) &&
           steady_clock::now() - begin < kPatience) {
        std::this_thread::sleep_for(milliseconds(5));
    }
    if (!ended) {
        kill(-pid, SIGKILL);
        wait4(pid, &status, 0, &usage);
    }
    const auto took = std::chrono::duration_cast<milliseconds>(steady_clock::now() - begin);
    return {ended, took, usage.ru_maxrss};
}

// --- what a stranger plants
// -----------------------------------------------------------------------

const fs::path kCanary = "/etc/canary";

struct Canary {
    Canary() {
        fs::remove_all(kCanary);
        fs::create_directories(kCanary / "folder");
        std::ofstream(kCanary / "file") << "untouched\n";
        fs::permissions(kCanary / "file", fs::perms(0600));
        before_ = Look();
    }
    bool IsUntouched() const { return Look() == before_; }

  private:
    static std::string Look() {
        return Must("cd " + kCanary.string() +
                    " && find . -printf '%p %y %m %u %g %s %C@\\n' | sort && cat file");
    }
    std::string before_;
};

bool IsFolder(const fs::path& path) {
    return fs::is_directory(fs::symlink_status(path));
}

struct Plant {
    const char* name;
    /** For commands that take long, only what is a trap of its own there. */
    bool for_folders, for_files;
    bool (*put)(const std::string& path, bool is_folder);
};

const Plant kPlants[] = {
    {"link", true, true,
     [](const std::string& path, bool is_folder) {
         return stranger::Link(kCanary / (is_folder ? "folder" : "file"), path);
     }},
    {"fifo", false, true, [](const std::string& path, bool) { return stranger::Fifo(path); }},
    {"sparse file", false, true,
     [](const std::string& path, bool) { return stranger::Sparse(path, off_t{1} << 30); }},
    {"folder", true, false, [](const std::string& path, bool) { return stranger::Folder(path); }},
    {"dangling link", false, false,
     [](const std::string& path, bool) { return stranger::Link(kCanary / "fresh", path); }},
};

/** Whether others than the owner may put something there first. */
bool IsOpenToOthers(const fs::path& folder) {
    struct stat info {};
    return lstat(folder.c_str(), &info) == 0 && S_ISDIR(info.st_mode) &&
           ((info.st_mode & S_IWOTH) != 0 || info.st_uid == stranger::kMallory);
}

/** Our own trees, without what has another name each time, what is behind the fuse daemon, and the
 * folders that gvfs makes as the user. */
bool IsOfInterest(const fs::path& path) {
    static const std::regex random(
        R"([0-9a-f]{16}|\.foreign\.|XXXXXX|/dbus-|mldbm|socket-|/4001/(gvfsd|dconf))");
    const std::string text = path;
    const bool ours = text.rfind("/var/tmp/", 0) == 0 || text.rfind("/tmp/", 0) == 0 ||
                      text.rfind("/usr/zyro/", 0) == 0;
    return ours && text.rfind(kFuseTree + "/", 0) != 0 && !std::regex_search(text, random);
}

/** Files of root's in folders of the stranger's, however deep. */
std::vector<std::string> LeftWithStranger() {
    std::vector<std::string> found;
    for (const char* top : {"/var/tmp", "/tmp", "/usr/zyro/etc"}) {
        for (const auto& entry :
             fs::recursive_directory_iterator(top, fs::directory_options::skip_permission_denied)) {
            if (stranger::OwnerOf(entry.path().parent_path()) == stranger::kMallory &&
                stranger::OwnerOf(entry.path()) == 0) {
                found.push_back(entry.path());
            }
        }
    }
    return found;
}

bool IsNested(const fs::path& a, const fs::path& b) {
    const std::string shorter = std::min(a.string(), b.string());
    const std::string longer = std::max(a.string(), b.string());
    return longer.rfind(shorter + "/", 0) == 0;
}

/** Sets of paths none of which stands in another of its set. */
std::vector<std::vector<fs::path>> Rounds(const std::vector<fs::path>& paths) {
    std::vector<std::vector<fs::path>> rounds;
    for (const fs::path& path : paths) {
        auto round = std::find_if(rounds.begin(), rounds.end(), [&](const auto& other) {
            return std::none_of(other.begin(), other.end(),
                                [&](const fs::path& p) { return IsNested(p, path); });
        });
        if (round == rounds.end()) {
            round = rounds.insert(rounds.end(), std::vector<fs::path>{});
        }
        round->push_back(path);
    }
    return rounds;
}

class PlantedPaths : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        machine::AddUser("amy", kAmy);
        machine::AddUser("mallory", stranger::kMallory);
        machine::Remote("start secret");
        fs::create_directories(kTraces);
        std::ofstream("/run/password") << "secret\n";
        for (const Operation& operation : kOperations) {
            if (operation.name != "user-clean") {
                Perform(kTool + operation.arguments);
            }
        }
        EndUser();
        TakeSnapshot();
    }
    static void TearDownTestSuite() { EndUser(); }

    /** For each part of a path that a stranger can reach, a command: the quickest of those that
     * change something there or, if none does, of all that touch it. */
    void Trace() {
        for (size_t i = 0; i < kOperations.size(); ++i) {
            Restore();
            const std::string trace = kTraces + kOperations[i].name;
            const Ending ending =
                Perform(traced_paths::Tracing(trace) + kTool + kOperations[i].arguments);
            EXPECT_TRUE(ending.in_time) << kOperations[i].name;
            EndUser();
            // It writes to the end, and is no child of ours.
            EXPECT_TRUE(machine::Eventually([] { return !IsTracing(); }));
            traces_.push_back({ending.took, traced_paths::Read(trace)});
        }
        Restore();
        for (size_t i = 0; i < kOperations.size(); ++i) {
            for (const auto& [path, changed] : traces_[i].touched) {
                if (IsOfInterest(path) && IsOpenToOthers(fs::path(path).parent_path()) &&
                    IsBetter(path, changed, i)) {
                    chosen_[path] = i;
                }
            }
        }
    }

    bool IsBetter(const std::string& path, bool changed, size_t candidate) const {
        const auto known = chosen_.find(path);
        if (known == chosen_.end()) {
            return true;
        }
        const OneTrace& now = traces_[known->second];
        const OneTrace& other = traces_[candidate];
        if (changed != now.touched.at(path)) {
            return changed;
        }
        return other.took < now.took;
    }

    void Attack(const std::vector<fs::path>& round, const Plant& plant,
                const Operation& operation) {
        Restore();
        const Canary canary;
        std::string planted;
        for (const fs::path& path : round) {
            const bool is_folder = IsFolder(path);
            fs::remove_all(path);
            if (plant.put(path, is_folder)) {
                planted += path.string() + " ";
                ++count_;
            }
        }
        if (planted.empty()) {
            return;
        }
        const Ending ending = Perform(kTool + operation.arguments);
        EndUser();  // what is mounted is not the machine's
        const std::string what =
            std::string(plant.name) + " at " + planted + "for " + operation.name + "\n";
        EXPECT_TRUE(ending.in_time) << what;
        EXPECT_LT(ending.memory, kMostMemory) << what;
        EXPECT_TRUE(canary.IsUntouched()) << what << Must("ls -laR " + kCanary.string());
        EXPECT_THAT(LeftWithStranger(), testing::IsEmpty()) << what;
    }

    struct OneTrace {
        milliseconds took;
        traced_paths::Touched touched;
    };
    std::vector<OneTrace> traces_;
    std::map<std::string, size_t> chosen_;
    int count_ = 0;
};

TEST_F(PlantedPaths, OfAStrangersLeadRootNowhereAndKeepNobodyWaiting) {
    Trace();
    std::vector<std::string> found;
    // A folder's place and a file's: what stands there is looked at in different ways.
    std::map<std::pair<size_t, bool>, std::vector<fs::path>> of_operation;
    for (const auto& [path, operation] : chosen_) {
        found.push_back(path);
        of_operation[{operation, IsFolder(path)}].push_back(path);
    }
    // Were the trace not read, nothing would be planted.
    EXPECT_THAT(found,
                IsSupersetOf<std::string>(
                    {"/var/tmp/zyrovfs", "/var/tmp/zyrovfs/4001",
                     "/var/tmp/zyrovfs/4001/connect.conf", "/var/tmp/user", "/var/tmp/user/4001",
                     "/var/tmp/user/4001/dbus/dbus.path", "/var/tmp/user/4001/zyrovfs/gvfsd.pid",
                     "/var/tmp/user/4001/zyrovfs/task/copy/copy.lock", "/tmp/zyrovfs",
                     "/tmp/zyrovfs/lock/user/4001/mnt.lock", "/tmp/userlock",
                     "/usr/zyro/etc/zyrovfs/4001/servers.conf", "/var/tmp/zos"}));
    for (const auto& [key, paths] : of_operation) {
        const auto& [operation, folders] = key;
        for (const auto& round : Rounds(paths)) {
            for (const Plant& plant : kPlants) {
                if (traces_[operation].took < kQuick ||
                    (folders ? plant.for_folders : plant.for_files)) {
                    Attack(round, plant, kOperations[operation]);
                }
            }
        }
    }
    EXPECT_GT(count_, 80);
    RecordProperty("planted", count_);
}

TEST_F(PlantedPaths, DevicesAreNothingThatAStrangerCanPlant) {
    EXPECT_FALSE(stranger::As(stranger::kMallory, [] {
        return mknod("/tmp/device", S_IFCHR | 0666, makedev(1, 5)) == 0;
    }));
}

}  // namespace
