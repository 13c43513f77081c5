/** What only reads: user, folders, listings, files, search. */
#include <algorithm>
#include <sstream>

#include "support/cloudsim/box.h"
#include "support/cloudsim/box_json.h"

namespace cloudsim {
namespace {

struct Page {
    uint64_t offset, limit;
};

Page PageOf(const Request& request, uint64_t usual, uint64_t most, uint64_t max_offset) {
    const auto limit = ParseNumber(request.Query("limit", std::to_string(usual)));
    const auto offset = ParseNumber(request.Query("offset", "0"));
    if (!limit) {
        throw box::Failure{box::Error(400, "invalid_limit", "Limit is not a valid number")};
    }
    if (!offset || *offset > max_offset) {
        throw box::Failure{box::Error(400, "invalid_offset", "Offset is not a valid number")};
    }
    return {*offset, std::min(*limit, most)};
}

Json::Value Order(const std::string& by, const std::string& direction) {
    Json::Value order;
    order["by"] = by;
    order["direction"] = direction;
    return order;
}

using Nodes = std::vector<const Node*>;
using Less = bool (*)(const Node&, const Node&);

Less LessBy(const std::string& key) {
    if (key == "date") {
        return [](const Node& a, const Node& b) { return a.modified < b.modified; };
    }
    if (key == "size") {
        return [](const Node& a, const Node& b) { return a.Size() < b.Size(); };
    }
    return [](const Node& a, const Node& b) { return FoldCase(a.name) < FoldCase(b.name); };
}

/** Folders stay before files, whatever the order within them. */
Nodes Sorted(const Node& folder, const std::string& key, bool descending) {
    Nodes nodes;
    nodes.reserve(folder.children.size());
    for (const auto& [place, child] : folder.children) {
        nodes.push_back(child);
    }
    if (key != "name" || descending) {
        std::stable_sort(nodes.begin(), nodes.end(),
                         [less = LessBy(key), descending](const Node* a, const Node* b) {
                             return a->folder != b->folder ? a->folder
                                    : descending           ? less(*b, *a)
                                                           : less(*a, *b);
                         });
    }
    return nodes;
}

Json::Value Entries(const Nodes& nodes, const Page& page, const Request& request, bool full) {
    Json::Value entries = Json::arrayValue;
    for (uint64_t i = page.offset; i < nodes.size() && i - page.offset < page.limit; i++) {
        entries.append(request.HasQuery("fields")
                           ? box::Selected(*nodes[i], request.Query("fields"))
                       : full ? box::Full(*nodes[i])
                              : box::Mini(*nodes[i]));
    }
    return entries;
}

std::vector<std::string> WordsOf(const std::string& query) {
    const std::string folded = FoldCase(query);
    if (folded.size() > 2 && folded.front() == '"' && folded.back() == '"') {
        return {folded.substr(1, folded.size() - 2)};
    }
    std::istringstream text(folded);
    std::vector<std::string> words;
    std::string word;
    while (text >> word) {
        words.push_back(word);
    }
    return words;
}

void Gather(const Node& folder, const std::vector<std::string>& words, const std::string& type,
            Nodes& found) {
    for (const auto& [place, child] : folder.children) {
        const std::string& name = place.second;
        const bool named = std::all_of(words.begin(), words.end(), [&](const std::string& word) {
            return name.find(word) != std::string::npos;
        });
        if (named && (type.empty() || type == (child->folder ? "folder" : "file"))) {
            found.push_back(child);
        }
        Gather(*child, words, type, found);
    }
}

}  // namespace

Reply BoxService::GetUser(const BoxCall& call) {
    Json::Value user = box::User(call.account);
    user["space_used"] = Json::UInt64(tree_.Used(call.account));
    if (!call.request.HasQuery("fields")) {
        return JsonReply(200, user);
    }
    Json::Value chosen;
    chosen["type"] = user["type"];
    chosen["id"] = user["id"];
    std::istringstream names(call.request.Query("fields"));
    std::string name;
    while (std::getline(names, name, ',')) {
        if (user.isMember(name)) {
            chosen[name] = user[name];
        }
    }
    return JsonReply(200, chosen);
}

Reply BoxService::GetFolder(const BoxCall& call) {
    return JsonReply(200, Answer(call, Folder(call)));
}

Reply BoxService::GetFile(const BoxCall& call) {
    return JsonReply(200, Answer(call, File(call)));
}

/** A benchmark asks for the same pages of a long list again and again: made once, until a change.
 */
Reply BoxService::ListFolder(const BoxCall& call) {
    constexpr size_t kMost = 512;
    if (pages_version_ != tree_.Version() || pages_.size() >= kMost) {
        pages_.clear();
        pages_version_ = tree_.Version();
    }
    const auto key = std::make_pair(call.account.Id(), call.request.target);
    const auto known = pages_.find(key);
    return known != pages_.end() ? known->second : pages_[key] = MakePage(call);
}

Reply BoxService::MakePage(const BoxCall& call) {
    const Request& request = call.request;
    const Node& folder = Folder(call);
    const bool marked = request.Query("usemarker") == "true";
    Page page = PageOf(request, 100, 1000, marked ? UINT64_MAX : box_options_.max_offset);
    if (marked) {
        page.offset = ParseNumber(request.Query("marker", "0")).value_or(0);
    }
    const std::string key = request.Query("sort", "name");
    const std::string direction = request.Query("direction", "ASC");
    const Nodes nodes = Sorted(folder, key, direction == "DESC");
    Json::Value list;
    list["entries"] = Entries(nodes, page, request, false);
    list["limit"] = Json::UInt64(page.limit);
    if (marked) {
        const uint64_t next = page.offset + list["entries"].size();
        // The last page has no marker at all.
        if (next < nodes.size()) {
            list["next_marker"] = std::to_string(next);
        }
        return JsonReply(200, list);
    }
    list["total_count"] = Json::UInt64(nodes.size());
    list["offset"] = Json::UInt64(page.offset);
    list["order"].append(Order("type", "ASC"));
    list["order"].append(Order(key, direction));
    return JsonReply(200, list);
}

Reply BoxService::Search(const BoxCall& call) {
    const Request& request = call.request;
    if (request.Query("query").empty()) {
        return box::Error(400, "bad_request", "Bad Request: query is required");
    }
    const Page page = PageOf(request, 30, 200, 10000);
    Nodes found;
    std::istringstream ancestors(request.Query("ancestor_folder_ids", tree_.RootId(call.account)));
    std::string id;
    while (std::getline(ancestors, id, ',')) {
        Gather(Find(call, id, true), WordsOf(request.Query("query")), request.Query("type"), found);
    }
    Json::Value list;
    list["type"] = "search_results_items";
    list["total_count"] = Json::UInt64(found.size());
    list["limit"] = Json::UInt64(page.limit);
    list["offset"] = Json::UInt64(page.offset);
    list["entries"] = Entries(found, page, request, true);
    return JsonReply(200, list);
}

std::map<std::string, std::string> BoxService::Attributes(const Account&, const Item& item) {
    return {{"id::file", (item.folder ? "folders/" : "files/") + item.id}};
}

}  // namespace cloudsim
