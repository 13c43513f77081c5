#define FUSE_USE_VERSION 31
#include "support/xattrtree/xattrtree.h"

#include <fuse.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <map>
#include <mutex>
#include <stdexcept>
#include <thread>

namespace {

struct Node {
    bool folder = false;
    long long size = 0;
    std::map<std::string, std::string> attributes;
};

std::string ParentOf(const std::string& path) {
    const size_t cut = path.rfind('/');
    return cut == 0 ? "/" : path.substr(0, cut);
}

}  // namespace

struct XattrTree::State {
    mutable std::mutex mutex;
    std::map<std::string, Node> nodes{{"/", {true, 0, {}}}};
    std::map<std::string, int> failures;
    std::vector<Written> writes;
    struct fuse* session = nullptr;
    std::thread loop;

    Node* Find(const std::string& path) {
        const auto found = nodes.find(path);
        return found == nodes.end() ? nullptr : &found->second;
    }
    Node& Make(const std::string& path) {
        if (Node* there = Find(path)) {
            return *there;
        }
        Make(ParentOf(path)).folder = true;
        return nodes[path];
    }
    int FailureOf(const char* name) const {
        const auto found = failures.find(name);
        return found == failures.end() ? 0 : found->second;
    }
};

namespace {

XattrTree::State& Tree() {
    return *static_cast<XattrTree::State*>(fuse_get_context()->private_data);
}

int GetAttr(const char* path, struct stat* out, fuse_file_info* /*info*/) {
    XattrTree::State& tree = Tree();
    const std::lock_guard lock(tree.mutex);
    const Node* node = tree.Find(path);
    if (node == nullptr) {
        return -ENOENT;
    }
    *out = {};
    out->st_mode = node->folder ? S_IFDIR | 0755 : S_IFREG | 0644;
    out->st_nlink = 1;
    out->st_size = node->size;
    return 0;
}

int ReadDir(const char* path, void* buffer, fuse_fill_dir_t fill, off_t /*offset*/,
            fuse_file_info* /*info*/, fuse_readdir_flags /*flags*/) {
    XattrTree::State& tree = Tree();
    const std::lock_guard lock(tree.mutex);
    for (const auto& [name, node] : tree.nodes) {
        if (name != "/" && ParentOf(name) == path) {
            fill(buffer, name.c_str() + name.rfind('/') + 1, nullptr, 0, fuse_fill_dir_flags{});
        }
    }
    return 0;
}

int GetXattr(const char* path, const char* name, char* buffer, size_t size) {
    XattrTree::State& tree = Tree();
    const std::lock_guard lock(tree.mutex);
    if (const int error = tree.FailureOf(name)) {
        return -error;
    }
    const Node* node = tree.Find(path);
    if (node == nullptr) {
        return -ENOENT;
    }
    const auto found = node->attributes.find(name);
    if (found == node->attributes.end()) {
        return -ENODATA;
    }
    const std::string& value = found->second;
    if (size == 0) {
        return static_cast<int>(value.size());
    }
    if (size < value.size()) {
        return -ERANGE;
    }
    memcpy(buffer, value.data(), value.size());
    return static_cast<int>(value.size());
}

int SetXattr(const char* path, const char* name, const char* value, size_t size, int /*flags*/) {
    XattrTree::State& tree = Tree();
    const std::lock_guard lock(tree.mutex);
    if (const int error = tree.FailureOf(name)) {
        return -error;
    }
    if (tree.Find(path) == nullptr) {
        return -ENOENT;
    }
    tree.writes.push_back({path, name, std::string(value, size)});
    return 0;
}

fuse_operations Operations() {
    fuse_operations operations{};
    operations.getattr = GetAttr;
    operations.readdir = ReadDir;
    operations.getxattr = GetXattr;
    operations.setxattr = SetXattr;
    // Tests change the tree behind the kernel's back: it is to keep nothing.
    operations.init = [](fuse_conn_info* /*connection*/, fuse_config* config) {
        config->attr_timeout = 0;
        config->entry_timeout = 0;
        config->negative_timeout = 0;
        return fuse_get_context()->private_data;
    };
    return operations;
}

}  // namespace

XattrTree::XattrTree(std::string folder)
    : folder_(std::move(folder)), state_(std::make_unique<State>()) {
    mkdir(folder_.c_str(), 0755);
    static const fuse_operations operations = Operations();
    char program[] = "xattrtree";
    char allow[] = "-oallow_other";
    char* arguments[] = {program, allow, nullptr};
    fuse_args args = FUSE_ARGS_INIT(2, arguments);
    state_->session = fuse_new(&args, &operations, sizeof operations, state_.get());
    fuse_opt_free_args(&args);
    if (state_->session == nullptr || fuse_mount(state_->session, folder_.c_str()) != 0) {
        throw std::runtime_error("xattrtree: cannot mount on " + folder_);
    }
    state_->loop = std::thread([session = state_->session] { fuse_loop(session); });
}

XattrTree::~XattrTree() {
    fuse_unmount(state_->session);
    state_->loop.join();
    fuse_destroy(state_->session);
}

void XattrTree::Add(const std::string& path, long long size) {
    const std::lock_guard lock(state_->mutex);
    state_->Make(path).size = size;
}

void XattrTree::AddFolder(const std::string& path) {
    const std::lock_guard lock(state_->mutex);
    state_->Make(path).folder = true;
}

void XattrTree::Remove(const std::string& path) {
    const std::lock_guard lock(state_->mutex);
    state_->nodes.erase(path);
}

void XattrTree::Set(const std::string& path, const std::string& name, const std::string& value) {
    const std::lock_guard lock(state_->mutex);
    state_->Make(path).attributes[name] = value;
}

void XattrTree::Unset(const std::string& path, const std::string& name) {
    const std::lock_guard lock(state_->mutex);
    if (Node* node = state_->Find(path)) {
        node->attributes.erase(name);
    }
}

void XattrTree::Fail(const std::string& name, int error) {
    const std::lock_guard lock(state_->mutex);
    state_->failures[name] = error;
}

std::vector<XattrTree::Written> XattrTree::Writes() const {
    const std::lock_guard lock(state_->mutex);
    return state_->writes;
}
