// Several threads of a backend at once.
#include <atomic>
#include <functional>
#include <thread>

#include "support/backend.h"

namespace backend {
namespace {

using testing::UnorderedElementsAreArray;

constexpr int kRounds = 4;

class FlowThreads : public EachBackend {
  protected:
    void SetUp() override {
        EachBackend::SetUp();
        ZYROCloud::Cloud::InitCurlGlobal();
        for (int i = 0; i < 20; ++i) {
            names.push_back("a" + std::to_string(i) + ".txt");
            amy.AddPath("/" + names.back(), std::string(static_cast<size_t>(100 + i), 'a'));
        }
    }

    /** Runs these side by side until all have ended. */
    static void Together(const std::vector<std::function<void()>>& jobs) {
        std::vector<std::thread> threads;
        threads.reserve(jobs.size());
        for (const auto& job : jobs) {
            threads.emplace_back(job);
        }
        for (std::thread& thread : threads) {
            thread.join();
        }
    }

    /** A listing by any thread; the names that its callback was told. */
    std::vector<std::string> ListNames() {
        std::vector<std::string> told;
        const auto tell = [](GFileInfo* info, void* user_data) {
            static_cast<std::vector<std::string>*>(user_data)->emplace_back(
                g_file_info_get_name(info));
        };
        int error = kUntouched;
        EXPECT_EQ(rig->List(server_id.c_str(), cache, rig->Top().c_str(), tell, &told, &error), 1);
        return told;
    }

    /** What a listing by any thread tells of a file. */
    ZYROCloud::UniqueFileInfo Find(const std::string& name) {
        struct Search {
            const std::string& name;
            GFileInfo* found;
        } search{name, nullptr};
        const auto compare = [](GFileInfo* info, void* user_data) {
            auto& wanted = *static_cast<Search*>(user_data);
            if (wanted.name == g_file_info_get_name(info)) {
                wanted.found = static_cast<GFileInfo*>(g_object_ref(info));
            }
        };
        int error = kUntouched;
        rig->List(server_id.c_str(), cache, rig->Top().c_str(), compare, &search, &error);
        EXPECT_NE(search.found, nullptr) << name << " " << error;
        return ZYROCloud::UniqueFileInfo(search.found);
    }

    /** The contents of a file, read by any thread. */
    std::string Contents(GFileInfo* info) {
        const UniqueHandle handle(
            ZYROCloud_Cloud_Handle_New(server_id.c_str(), IdOf(info).c_str(), info));
        std::string all;
        std::string piece(65, '\0');
        int error = kUntouched;
        for (long long got = 1; got > 0;) {
            char* dest = piece.data();
            got = rig->Read(handle.get(), &dest, 64, &error);
            all.append(piece, 0, static_cast<size_t>(std::max(got, 0LL)));
        }
        EXPECT_EQ(error, kUntouched);
        return all;
    }

    std::vector<std::string> names;
};

TEST_P(FlowThreads, ThatListOneFolderEachSeeAllOfItUnderItsOwnNames) {
    const auto list = [&] {
        for (int i = 0; i < kRounds; ++i) {
            EXPECT_THAT(ListNames(), UnorderedElementsAreArray(names));
        }
    };
    Together({list, list, list});
    for (const std::string& name : names) {
        EXPECT_NE(Cached(Shown("/" + name)), nullptr) << name;
    }
}

TEST_P(FlowThreads, ThatRemoveTheParentOfAListedFolderDoNotDisturbIt) {
    std::atomic<bool> listed{false};
    const auto list = [&] {
        for (int i = 0; i < kRounds; ++i) {
            EXPECT_THAT(ListNames(), UnorderedElementsAreArray(names));
        }
        listed = true;
    };
    const auto remove = [&] {
        while (!listed) {
            EXPECT_EQ(ZYROCloud_Cache_Entry_Remove(cache, rig->Top().c_str(), false), 1);
            std::this_thread::yield();
        }
    };
    Together({list, remove});
    EXPECT_THAT(ListNames(), UnorderedElementsAreArray(names));
    for (const std::string& name : names) {
        EXPECT_NE(Cached(Shown("/" + name)), nullptr) << name;
    }
}

TEST_P(FlowThreads, ThatReadTwoFilesEachGetTheirOwnBytes) {
    const UniqueHandle first = Open("a1.txt");
    const UniqueHandle second = Open("a2.txt");
    const auto read = [this](const UniqueHandle& handle, size_t size) {
        std::string all;
        std::string piece(8, '\0');
        int error = kUntouched;
        for (long long got = 1; got > 0;) {
            char* dest = piece.data();
            got = rig->Read(handle.get(), &dest, 7, &error);
            all.append(piece, 0, static_cast<size_t>(std::max(got, 0LL)));
        }
        EXPECT_EQ(all, std::string(size, 'a'));
        EXPECT_EQ(error, kUntouched);
    };
    Together({[&] { read(first, 101); }, [&] { read(second, 102); }});
}

// Fresh drivers for all of it, handles of the pool, and the profile under them changing its file.
TEST_P(FlowThreads, ThatListRenameReadAndDeleteWhileTheConnectionIsRewrittenGetAlong) {
    const std::string path = profiles::File(profiles::VFS_CONFIG_CONNECT);
    const Json::Value document = Object(profiles::Text(path));
    const auto rewrite = [&] {
        for (int i = 0; i < 5 * kRounds; ++i) {
            EXPECT_TRUE(json::toFile(document, path, 0600));
        }
    };
    const auto work = [&](int number) {
        std::string name = names[static_cast<size_t>(number)];
        int error = kUntouched;
        for (int i = 0; i < kRounds; ++i) {
            const std::string id = IdOf(Find(name).get());
            name = std::to_string(i) + " " + names[static_cast<size_t>(number)];
            EXPECT_EQ(ZYROCloud_Cloud_Rename(server_id.c_str(), kUnused, id.c_str(), name.c_str(),
                                             &error),
                      1);
            EXPECT_EQ(Contents(Find(name).get()),
                      std::string(static_cast<size_t>(100 + number), 'a'));
        }
        const std::string id = IdOf(Find(name).get());
        EXPECT_EQ(ZYROCloud_Cloud_Delete(server_id.c_str(), kUnused, id.c_str(), &error), 1);
        EXPECT_EQ(error, kUntouched);
    };
    Together({rewrite, [&] { work(0); }, [&] { work(1); }, [&] { work(2); }, [&] { work(3); }});
    EXPECT_EQ(ListNames().size(), names.size() - 4);
}

}  // namespace

RUN_FOR_EACH_BACKEND(FlowThreads);

}  // namespace backend
