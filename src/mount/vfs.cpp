#include "zyrovfs/vfs.h"

#include <cstring>
#include <new>

#include "core/error_cell.h"
#include "core/no_throw.h"
#include "mount/vfs_private.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

constexpr const char* kUtf8 = "UTF-8";

/** Callers hand on what a profile lacks as null. */
std::string TextOf(const char* text) {
    return text == nullptr ? std::string() : std::string(text);
}

}  // namespace

VFS::VFS() : private_(new (std::nothrow) VFSPrivate(this)) {}

VFS::~VFS() {
    delete private_;
}

bool VFS::CheckPermission() {
    return true;
}

bool VFS::Init() {
    return CheckPermission() || Fail(VFS_ERR_NO_PERMISSION);
}

bool VFS::Init(const char* user, const char* pass, const char* uri, const char* path,
               const char* codepage, const Json::Value& data, bool force) {
    return NoThrow(VFS_ERR_FAILED, [&] {
        if (!Init()) {
            return false;
        }
        SetUser(user);
        SetPass(pass);
        SetURI(uri);
        SetForce(force);
        SetPath(path, codepage);
        SetData(data);
        return true;
    });
}

std::string VFS::GetUser() const {
    return private_ == nullptr ? std::string() : private_->user;
}

std::string VFS::GetPass() const {
    return private_ == nullptr ? std::string() : private_->password;
}

std::string VFS::GetURI() const {
    return private_ == nullptr ? std::string() : private_->uri;
}

std::string VFS::GetPath() const {
    return private_ == nullptr ? std::string() : private_->path;
}

std::string VFS::GetCodePage() const {
    return private_ == nullptr ? std::string() : private_->code_page;
}

std::string VFS::GetFullPath() const {
    return private_ == nullptr ? std::string() : private_->full_path;
}

Json::Value VFS::GetData() const {
    return private_ == nullptr ? Json::Value() : private_->data;
}

bool VFS::GetForce() const {
    return private_ != nullptr && private_->force;
}

std::string VFS::GetFullURI() const {
    const std::string path = GetPath();
    return path.empty() ? GetURI() : GetURI() + "/" + path;
}

void VFS::SetUser(const char* user) {
    if (private_ != nullptr) {
        private_->user = TextOf(user);
    }
}

void VFS::SetPass(const char* pass) {
    if (private_ != nullptr) {
        private_->password = TextOf(pass);
    }
}

void VFS::SetURI(const char* uri) {
    if (private_ != nullptr) {
        private_->uri = TextOf(uri);
    }
}

void VFS::SetFullPath(const char* path) {
    if (private_ != nullptr) {
        private_->full_path = TextOf(path);
    }
}

void VFS::SetPath(const char* path, const char* codepage) {
    if (path == nullptr || private_ == nullptr) {
        return;
    }
    private_->path = path;
    if (codepage == nullptr || *codepage == '\0') {
        return;
    }
    private_->code_page = codepage;
    if (strcmp(codepage, kUtf8) != 0) {
        // A path that cannot be converted comes back as it was, and is worth a try.
        std::string converted;
        Utils::ConvString(converted, private_->path.c_str(), kUtf8, codepage);
        private_->path = converted;
    }
}

void VFS::SetForce(bool force) {
    if (private_ != nullptr) {
        private_->force = force;
    }
}

void VFS::SetData(const Json::Value& data) {
    if (private_ != nullptr) {
        private_->data = data;
    }
}

}  // namespace ZYROVFS
