/** From a path to what lies there. */
#include <algorithm>
#include <functional>

#include "support/cloudsim/dropbox.h"
#include "support/cloudsim/route.h"

namespace cloudsim {
namespace {

/** All between the slashes, also where that is nothing; how many there are in front is no matter.
 */
std::vector<std::string> Split(const std::string& path) {
    std::vector<std::string> names;
    const size_t first = path.find_first_not_of('/');
    for (size_t start = first == std::string::npos ? 1 : first; start <= path.size();) {
        const size_t end = std::min(path.find('/', start), path.size());
        names.push_back(path.substr(start, end - start));
        start = end + 1;
    }
    return names;
}

}  // namespace

/** "/a/b", "id:x", "id:x/b", "ns:1/a" and "rev:x"; what has none of these forms is a 400. */
Dropbox::Place Dropbox::Resolve(const DropboxCall& call, const std::string& path,
                                const char* where) {
    const std::string first = path.substr(0, path.find('/'));
    const std::string rest = path.substr(first.size());
    Place place = {&tree_.Root(call.account), Split(rest)};
    if (BeginsWith(first, "id:")) {
        place.base = tree_.Find(call.account, first);
    } else if (BeginsWith(first, "rev:") && rest.empty()) {
        const std::vector<const Node*> all = tree_.All(call.account);
        const auto found = std::find_if(all.begin(), all.end(), [&](const Node* node) {
            return !node->folder && "rev:" + dropbox::Revision(*node) == first;
        });
        place.base = found == all.end() ? nullptr : tree_.Find(call.account, (*found)->id);
    } else if (BeginsWith(first, "ns:")) {
        place.base = first == "ns:" + call.account.Id() ? place.base : nullptr;
    } else if (!first.empty()) {
        call.args.Refuse("path: '" + path +
                         "' did not match pattern '(/(.|[\\r\\n])*)|(ns:[0-9]+(/.*)?)|(id:.*)'");
    }
    if (place.base == nullptr) {
        throw dropbox::Fail({where, "not_found"});
    }
    if (!std::all_of(place.names.begin(), place.names.end(), dropbox::IsName)) {
        throw dropbox::Fail({where, "malformed_path"});
    }
    return place;
}

Node* Dropbox::Walk(const Place& place) {
    Node* node = place.base;
    for (const std::string& name : place.names) {
        node = node == nullptr ? nullptr : tree_.Child(*node, name);
    }
    return node;
}

Node& Dropbox::Find(const DropboxCall& call, const std::string& path, const char* where) {
    Node* node = Walk(Resolve(call, path, where));
    return node != nullptr ? *node : throw dropbox::Fail({where, "not_found"});
}

Dropbox::Target Dropbox::TargetOf(const DropboxCall& call, const std::string& path,
                                  const char* where) {
    Place place = Resolve(call, path, where);
    if (place.names.empty()) {
        // An id of a file that is there names its place.
        if (place.base->parent == nullptr) {
            throw dropbox::Fail({where, "malformed_path"});
        }
        return {place.base->parent, {}, place.base->name, place.base};
    }
    Target target = {place.base, {}, place.names.back(), nullptr};
    place.names.pop_back();
    for (const std::string& name : place.names) {
        Node* next = target.missing.empty() ? tree_.Child(*target.folder, name) : nullptr;
        if (next == nullptr) {
            target.missing.push_back(name);
        } else {
            target.folder = next;
        }
    }
    if (!target.folder->folder) {
        throw dropbox::Fail({where, "conflict", "file_ancestor"});
    }
    target.taken = target.missing.empty() ? tree_.Child(*target.folder, target.name) : nullptr;
    return target;
}

Node& Dropbox::MakeWay(const Target& target) {
    Node* folder = target.folder;
    for (const std::string& name : target.missing) {
        folder = &tree_.AddFolder(*folder, name);
    }
    return *folder;
}

std::string Dropbox::FreeName(const Target& target, bool folder) const {
    for (int number = 2;; number++) {
        std::string name = dropbox::Numbered(target.name, folder, number);
        if (tree_.Child(*target.folder, name) == nullptr) {
            return name;
        }
    }
}

std::string Dropbox::NameFor(const Target& target, bool folder, bool rename,
                             const char* where) const {
    if (target.taken == nullptr) {
        return target.name;
    }
    return rename
               ? FreeName(target, folder)
               : throw dropbox::Fail({where, "conflict", target.taken->folder ? "folder" : "file"});
}

}  // namespace cloudsim
