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

/** Empty when the account isn't served from a disk. */
std::string Tree::DiskPath(const Node& parent, const std::string& name) const {
    const auto disk = disks_.find(parent.owner);
    if (disk == disks_.end()) {
        return "";
    }
    std::string path = "/" + name;
    for (const Node* node = &parent; node->parent != nullptr; node = node->parent) {
        path.insert(0, "/" + node->name);
    }
    return disk->second + path;
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
    const std::string path = DiskPath(parent, name);
    if (!path.empty() && mkdir(path.c_str(), 0755) != 0) {
        Fail("cannot make folder", path);
    }
    return Make(parent, name, true);
}

Node& Tree::AddFile(Node& parent, const std::string& name, ContentPtr content) {
    content = ToDisk(DiskPath(parent, name), std::move(content));
    Node& file = Make(parent, name, false);
    file.content = std::move(content);
    file.version_id = std::to_string(last_id_ += 17);
    return file;
}

void Tree::SetContent(Node& file, ContentPtr content) {
    file.content = ToDisk(DiskPath(*file.parent, file.name), std::move(content));
    file.version_id = std::to_string(last_id_ += 17);
    file.content_modified = now_();
    Touch(file);
}

void Tree::Move(Node& node, Node& parent, const std::string& name) {
    const std::string from = DiskPath(*node.parent, node.name), to = DiskPath(parent, name);
    if (!from.empty() && from != to && rename(from.c_str(), to.c_str()) != 0) {
        Fail("cannot move", from);
    }
    node.parent->children.erase(KeyOf(node));
    node.parent = &parent;
    node.name = name;
    parent.children[KeyOf(node)] = &node;
    Touch(node);
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
    const std::string path = DiskPath(*node.parent, node.name);
    if (!path.empty()) {
        fs::remove_all(path);
    }
    node.parent->children.erase(KeyOf(node));
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
