/** What only reads: user, quota, items, listings, search. */
#include <algorithm>
#include <map>
#include <set>
#include <sstream>

#include "support/cloudsim/onedrive.h"
#include "support/cloudsim/onedrive_json.h"

namespace cloudsim {
namespace {

using Nodes = std::vector<const Node*>;
using Less = bool (*)(const Node&, const Node&);

uint64_t NumberOf(const Request& request, const std::string& name, uint64_t missing) {
    const auto number = ParseNumber(request.Query(name, std::to_string(missing)));
    return number ? *number
                  : throw onedrive::Failure{
                        onedrive::Error(400, "request_parameter_invalid",
                                        "The value of the parameter '" + name + "' isn't valid.")};
}

const std::map<std::string, Less>& Orders() {
    static const std::map<std::string, Less> orders = {
        {"updated", [](const Node& a, const Node& b) { return a.modified < b.modified; }},
        {"name", [](const Node& a, const Node& b) { return FoldCase(a.name) < FoldCase(b.name); }},
        {"size", [](const Node& a, const Node& b) { return a.Size() < b.Size(); }}};
    return orders;
}

/** As the tree has them, folders first, unless the request wants another order. */
void Sort(const Request& request, Nodes& nodes) {
    const auto order = Orders().find(request.Query("sort_by", "default"));
    const bool down = request.Query("sort_order") == "descending";
    if (order != Orders().end()) {
        std::stable_sort(nodes.begin(), nodes.end(),
                         [less = order->second, down](const Node* a, const Node* b) {
                             return down ? less(*b, *a) : less(*a, *b);
                         });
    } else if (down) {
        std::reverse(nodes.begin(), nodes.end());
    }
}

/** "folders,albums" wants the types "folder" and "album"; "audio" has no plural, "all" all. */
std::set<std::string> TypesWanted(const std::string& filter) {
    std::set<std::string> types;
    std::istringstream words(filter);
    std::string word;
    while (filter != "all" && std::getline(words, word, ',')) {
        const bool plural = !word.empty() && word.back() == 's';
        types.insert(plural ? word.substr(0, word.size() - 1) : word);
    }
    return types;
}

void Gather(const Node& folder, const std::string& wanted, Nodes& found) {
    for (const auto& [key, child] : folder.children) {
        if (FoldCase(child->name).find(wanted) != std::string::npos) {
            found.push_back(child);
        }
        Gather(*child, wanted, found);
    }
}

}  // namespace

Reply OneDrive::GetUser(const OneDriveCall& call) const {
    return Answer(call.request, 200, onedrive::User(call.account));
}

Reply OneDrive::GetQuota(const OneDriveCall& call) {
    if (Item(call).parent != nullptr) {
        return onedrive::Error(400, "request_url_invalid", "Only a drive has a quota.");
    }
    const uint64_t quota = call.account.Quota(), used = tree_.Used(call.account);
    Json::Value answer;
    answer["quota"] = Json::UInt64(quota);
    answer["available"] = Json::UInt64(quota - std::min(quota, used));
    return Answer(call.request, 200, answer);
}

Reply OneDrive::GetItem(const OneDriveCall& call) {
    return Answer(call.request, 200, Show(Item(call)));
}

/** The pages of a long list are made once, until a change. */
Reply OneDrive::List(const OneDriveCall& call) {
    constexpr size_t kMost = 512;
    if (pages_version_ != tree_.Version() || pages_.size() >= kMost) {
        pages_.clear();
        pages_version_ = tree_.Version();
    }
    const auto key =
        std::make_pair(call.account.Id(), call.request.host + " " + call.request.target);
    const auto known = pages_.find(key);
    return known != pages_.end() ? known->second : pages_[key] = MakePage(call);
}

Reply OneDrive::MakePage(const OneDriveCall& call) {
    return ShowTypes(call, TypesWanted(call.request.Query("filter")));
}

/** Albums lie in the top folder alone. */
Reply OneDrive::ListAlbums(const OneDriveCall& call) {
    return ShowTypes(call, {"album"});
}

Reply OneDrive::ShowTypes(const OneDriveCall& call, const std::set<std::string>& types) {
    Nodes nodes;
    for (const auto& [key, child] : Folder(call.account, call.id).children) {
        if (types.empty() || types.count(TypeOf(*child)) > 0) {
            nodes.push_back(child);
        }
    }
    Sort(call.request, nodes);
    return ShowPage(call, nodes);
}

/** Without a limit all is one page. Only pages with a limit tell of their neighbours. */
Reply OneDrive::ShowPage(const OneDriveCall& call, const Nodes& nodes) const {
    const Request& request = call.request;
    const uint64_t offset = NumberOf(request, "offset", 0);
    const uint64_t limit = NumberOf(request, "limit", nodes.size());
    Json::Value page;
    page["data"] = Json::arrayValue;
    for (uint64_t i = offset; i < nodes.size() && i - offset < limit; i++) {
        page["data"].append(Show(*nodes[i]));
    }
    const std::string url = ApiHost() + request.path + "?limit=" + std::to_string(limit);
    if (request.HasQuery("limit") && offset + limit < nodes.size()) {
        page["paging"]["next"] = url + "&offset=" + std::to_string(offset + limit);
    }
    if (request.HasQuery("limit") && offset > 0) {
        page["paging"]["previous"] =
            url + "&offset=" + std::to_string(offset - std::min(offset, limit));
    }
    return Answer(request, 200, page);
}

Reply OneDrive::Search(const OneDriveCall& call) {
    const std::string wanted = FoldCase(call.request.Query("q"));
    if (wanted.empty()) {
        return onedrive::Error(400, "request_parameter_missing",
                               "The request must include the parameter 'q'.");
    }
    Nodes found;
    Gather(Folder(call.account, call.id), wanted, found);
    return ShowPage(call, found);
}

}  // namespace cloudsim
