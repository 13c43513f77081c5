#include "walk.h"

#include <gmock/gmock.h>

#include <map>

#include "failure.h"

namespace {

using namespace web;
using testing::ElementsAre;

/** Folders by their paths, with the names in them; a name that ends in a slash is a folder. */
class FakeTree : public Tree {
  public:
    explicit FakeTree(std::map<std::string, std::vector<std::string>> folders)
        : folders_(std::move(folders)) {}
    bool IsThere() override { return true; }
    void List(const std::string& path, const std::function<void(Entry)>& tell) override {
        const auto folder = folders_.find(path);
        if (folder == folders_.end()) {
            throw Failure(404, path);
        }
        for (const std::string& name : folder->second) {
            tell(EntryOf(name));
        }
    }
    Entry Look(const std::string& path) override {
        return folders_.count(path) != 0 ? EntryOf(path.substr(path.rfind('/') + 1) + "/")
                                         : EntryOf(path.substr(path.rfind('/') + 1));
    }
    void MakeFolder(const std::string&) override {}
    void Move(const std::string&, const std::string&, const std::string&) override {}
    void Delete(const std::string&, bool) override {}

  private:
    static Entry EntryOf(std::string name) {
        Entry entry;
        entry.folder = name.back() == '/';
        entry.file = !entry.folder && name != "link";
        entry.name = entry.folder ? name.substr(0, name.size() - 1) : name;
        entry.size = 1;
        return entry;
    }
    std::map<std::string, std::vector<std::string>> folders_;
};

std::vector<std::string> PathsOf(const std::vector<Item>& items) {
    std::vector<std::string> paths;
    for (const Item& item : items) {
        paths.push_back(item.below + "=" + item.path);
    }
    return paths;
}

std::vector<Item> WalkAll(Tree& tree, const std::vector<std::string>& paths,
                          size_t most = kMostItems) {
    return Walk(tree, paths, most, [](const Item&) {});
}

TEST(WebWalk, FoldersComeBeforeWhatIsInThem) {
    FakeTree tree({{"/", {"a/", "x"}}, {"/a", {"b/", "c"}}, {"/a/b", {"d"}}});
    EXPECT_THAT(PathsOf(WalkAll(tree, {"/a", "/x"})),
                ElementsAre("a=/a", "a/b=/a/b", "a/b/d=/a/b/d", "a/c=/a/c", "x=/x"));
    EXPECT_THAT(PathsOf(WalkAll(tree, {"/"})),
                ElementsAre("=/", "a=/a", "a/b=/a/b", "a/b/d=/a/b/d", "a/c=/a/c", "x=/x"));
}

TEST(WebWalk, LinksAndNamesThatCannotBeAreLeftOut) {
    FakeTree tree({{"/a", {"link", "..", "bad\xff", "x/y", "fine", ""}}});
    EXPECT_THAT(PathsOf(WalkAll(tree, {"/a"})), ElementsAre("a=/a", "a/fine=/a/fine"));
}

TEST(WebWalk, WhatIsTooMuchIsRefused) {
    FakeTree tree({{"/a", {"1", "2", "3"}}});
    EXPECT_EQ(WalkAll(tree, {"/a"}, 4).size(), 4U);
    EXPECT_THROW(WalkAll(tree, {"/a"}, 3), Failure);
    std::map<std::string, std::vector<std::string>> deep;
    std::string path;
    for (int i = 0; i < 200; ++i) {
        path += "/d";
        deep[path] = {"d/"};
    }
    FakeTree endless(deep);
    EXPECT_THROW(WalkAll(endless, {"/d"}), Failure);
}

TEST(WebWalk, AFolderThatCannotBeListedEndsIt) {
    FakeTree tree({{"/a", {"gone/"}}});
    EXPECT_THROW(WalkAll(tree, {"/a"}), Failure);
}

}  // namespace
