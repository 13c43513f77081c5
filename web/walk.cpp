#include "walk.h"

#include <utility>

#include "failure.h"
#include "name.h"

namespace web {
namespace {

constexpr int kDeepest = 100;

class Walker {
  public:
    Walker(Tree& tree, size_t most, const std::function<void(const Item&)>& tell)
        : tree_(tree), most_(most), tell_(tell) {}

    void Visit(const std::string& path, const std::string& below, const Entry& entry, int depth) {
        if (!entry.folder && !entry.file) {
            return;
        }
        if (items.size() == most_ || depth == kDeepest) {
            throw Failure(413, "That is too much for one go.").Advise("Choose fewer folders.");
        }
        items.push_back({path, below, entry.folder, entry.size, entry.modified});
        tell_(items.back());
        if (entry.folder) {
            VisitAll(path, below, depth + 1);
        }
    }

    std::vector<Item> items;

  private:
    void VisitAll(const std::string& path, const std::string& below, int depth) {
        std::vector<Entry> entries;
        tree_.List(path, [&](Entry entry) {
            if (IsName(entry.name) && items.size() + entries.size() <= most_) {
                entries.push_back(std::move(entry));
            }
        });
        for (const Entry& entry : entries) {
            Visit(Join(path, entry.name), below.empty() ? entry.name : below + "/" + entry.name,
                  entry, depth);
        }
    }

    Tree& tree_;
    const size_t most_;
    const std::function<void(const Item&)>& tell_;
};

}  // namespace

std::vector<Item> Walk(Tree& tree, const std::vector<std::string>& paths, size_t most,
                       const std::function<void(const Item&)>& tell) {
    Walker walker(tree, most, tell);
    for (const std::string& path : paths) {
        const Entry entry = tree.Look(CheckPath(path));
        walker.Visit(path, path == "/" ? "" : SplitPath(path).name, entry, 0);
    }
    return std::move(walker.items);
}

}  // namespace web
