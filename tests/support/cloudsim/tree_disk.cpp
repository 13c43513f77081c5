/** Changes of the tree, which an account served from a folder of the disk sees there as well. */
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <stdexcept>
#include <system_error>
#include <vector>

#include "support/cloudsim/tree.h"

namespace cloudsim {
namespace {

namespace fs = std::filesystem;

[[noreturn]] void Fail(const std::string& what, const std::string& path) {
    throw std::system_error(errno, std::generic_category(), what + " " + path);
}

void CopyTo(const Content& content, int fd, const std::string& path) {
    std::vector<char> piece(256 * 1024);
    uint64_t offset = 0;
    int64_t got = 0;
    while ((got = content.Read(offset, piece.data(), piece.size())) > 0) {
        for (int64_t done = 0; done < got;) {
            const ssize_t wrote = write(fd, piece.data() + done, static_cast<size_t>(got - done));
            if (wrote <= 0) {
                Fail("cannot write", path);
            }
            done += wrote;
        }
        offset += static_cast<uint64_t>(got);
    }
    if (offset != content.Size()) {
        Fail("cannot read all for", path);
    }
}

int64_t ModificationTime(const std::string& path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 ? status.st_mtime : 0;
}

}  // namespace

/** Empty when the account isn't served from a disk, or the item lies nowhere or in the trash. */
std::string Tree::DiskPath(const Node& node) const {
    const auto disk = disks_.find(node.owner);
    const Node* root = roots_.at(node.owner).get();
    std::string path;
    for (const Node* at = &node; at != root && disk != disks_.end(); at = at->parent) {
        if (at->trashed || at->parent == nullptr) {
            return "";
        }
        path.insert(0, "/" + at->disk_name);
    }
    return disk == disks_.end() ? "" : disk->second + path;
}

std::string Tree::DiskPath(const Node& parent, const std::string& disk_name) const {
    const std::string folder = DiskPath(parent);
    return folder.empty() ? "" : folder + "/" + disk_name;
}

/** Of several items of one name the first keeps it. */
std::string Tree::DiskName(const Node& parent, const std::string& name) const {
    constexpr size_t kLimit = 200;
    if (!rules_.graph || disks_.count(parent.owner) == 0) {
        return name;
    }
    std::string plain = name.substr(0, kLimit);
    std::replace(plain.begin(), plain.end(), '/', '_');
    std::replace(plain.begin(), plain.end(), '\0', '_');
    plain = plain.empty() || plain == "." || plain == ".." ? "_" : plain;
    const bool taken = fs::exists(fs::symlink_status(DiskPath(parent, plain)));
    return taken ? plain + "~" + std::to_string(last_id_ + 17) : plain;
}

/** Puts the content there, whole or not at all. The answer reads from the new file. */
ContentPtr Tree::ToDisk(const std::string& path, ContentPtr content) const {
    if (path.empty()) {
        return content;
    }
    std::string made = path.substr(0, path.rfind('/')) + "/.cloudsim-XXXXXX";
    const int fd = mkostemp(made.data(), O_CLOEXEC);
    if (fd < 0) {
        Fail("cannot make", made);
    }
    try {
        CopyTo(*content, fd, path);
        fchmod(fd, 0644);
        content = MakeFile(fd);
        if (rename(made.c_str(), path.c_str()) != 0) {
            Fail("cannot make", path);
        }
    } catch (...) {
        close(fd);
        unlink(made.c_str());
        throw;
    }
    close(fd);
    return content;
}

Node& Tree::AddFolder(Node& parent, const std::string& name) {
    const std::string disk_name = DiskName(parent, name);
    const std::string path = DiskPath(parent, disk_name);
    if (!path.empty() && mkdir(path.c_str(), 0755) != 0) {
        Fail("cannot make folder", path);
    }
    Node& folder = Make(parent, name, true);
    folder.disk_name = disk_name;
    return folder;
}

Node& Tree::AddFile(Node& parent, const std::string& name, ContentPtr content) {
    const std::string disk_name = DiskName(parent, name);
    content = ToDisk(DiskPath(parent, disk_name), std::move(content));
    Node& file = Make(parent, name, false);
    file.disk_name = disk_name;
    file.content = std::move(content);
    file.version_id = std::to_string(last_id_ += 17);
    return file;
}

void Tree::SetContent(Node& file, ContentPtr content) {
    file.content = ToDisk(DiskPath(file), std::move(content));
    file.version_id = std::to_string(last_id_ += 17);
    file.content_modified = now_();
    file.modified_millis = 0;
    Touch(file);
}

void Tree::Move(Node& node, Node& parent, const std::string& name) {
    Place(node, {&parent}, name);
}

void Tree::Place(Node& node, const std::vector<Node*>& parents, const std::string& name) {
    const std::string from = DiskPath(node), old_name = node.name, old_disk_name = node.disk_name;
    const std::vector<Node*> old_parents = node.Parents();
    Node* first = parents.empty() ? nullptr : parents.front();
    const bool stays = first == nullptr || (name == old_name && first == node.parent);
    const std::string disk_name = stays ? old_disk_name : DiskName(*first, name);
    Put(node, parents, name, disk_name);
    try {
        MoveOnDisk(node, from);
    } catch (...) {
        Put(node, old_parents, old_name, old_disk_name);
        throw;
    }
    Touch(node);
}

void Tree::Put(Node& node, const std::vector<Node*>& parents, const std::string& name,
               const std::string& disk_name) {
    Detach(node);
    node.parent = parents.empty() ? nullptr : parents.front();
    node.more_parents.assign(parents.begin() + (parents.empty() ? 0 : 1), parents.end());
    node.name = name;
    node.disk_name = disk_name;
    Attach(node);
}

void Tree::MoveOnDisk(Node& node, const std::string& from) {
    const std::string to = DiskPath(node);
    if (from == to) {
        return;
    }
    if (from.empty()) {
        Restore(node);
    } else if (to.empty()) {
        fs::remove_all(from);
    } else if (rename(from.c_str(), to.c_str()) != 0) {
        Fail("cannot move", from);
    }
}

/** An item that wasn't on the disk for a while. Its content could be read all the time. */
void Tree::Restore(Node& node) {
    node.disk_name = DiskName(*node.parent, node.name);
    const std::string path = DiskPath(node);
    if (path.empty()) {
        return;
    }
    if (!node.folder) {
        node.content = ToDisk(path, node.content);
        return;
    }
    fs::create_directory(path);
    for (const auto& [key, child] : node.children) {
        if (child->parent == &node && !child->trashed) {
            Restore(*child);
        }
    }
}

void Tree::SetTrashed(Node& node, bool trashed) {
    const std::string from = DiskPath(node);
    node.trashed = trashed;
    MoveOnDisk(node, from);
    version_++;
}

Node& Tree::Copy(const Node& node, Node& parent, const std::string& name) {
    if (!node.folder) {
        Node& file = AddFile(parent, name, node.content);
        file.content_created = node.content_created;
        file.content_modified = node.content_modified;
        file.description = node.description;
        return file;
    }
    // What is below is listed first: the copy may come to lie beside it.
    std::vector<const Node*> below;
    for (const auto& [key, child] : node.children) {
        below.push_back(child);
    }
    Node& folder = AddFolder(parent, name);
    folder.description = node.description;
    for (const Node* child : below) {
        Copy(*child, folder, child->name);
    }
    return folder;
}

void Tree::Remove(Node& node) {
    const std::string path = DiskPath(node);
    if (!path.empty()) {
        fs::remove_all(path);
    }
    Detach(node);
    version_++;
    Forget(node);
}

void Tree::Serve(const Account& account, const std::string& folder) {
    Import(Root(account), fs::canonical(folder).string());
    disks_[&account] = fs::canonical(folder).string();
}

void Tree::Import(Node& folder, const std::string& path) {
    for (const fs::directory_entry& entry : fs::directory_iterator(path)) {
        const std::string name = entry.path().filename().string();
        Node* node = nullptr;
        if (Child(folder, name) != nullptr) {
            throw std::runtime_error("names that differ only in case: " + entry.path().string());
        }
        if (entry.is_directory() && !entry.is_symlink()) {
            node = &Make(folder, name, true);
            Import(*node, entry.path().string());
        } else if (entry.is_regular_file() && !entry.is_symlink()) {
            ContentPtr content = MakeFile(entry.path().string());
            if (content == nullptr) {
                Fail("cannot open", entry.path().string());
            }
            node = &Make(folder, name, false);
            node->content = std::move(content);
            node->version_id = std::to_string(last_id_ += 17);
        }
        if (node != nullptr) {
            node->content_modified = node->modified = ModificationTime(entry.path().string());
            node->content_created = node->created = node->modified;
        }
    }
}

}  // namespace cloudsim
