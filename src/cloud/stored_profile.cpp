#include "cloud/stored_profile.h"

#include <cstring>

#include "core/file_memo.h"
#include "server/config_document.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

/** A profile whose texts are wiped when it goes. */
struct PlainProfile {
    PlainProfile() = default;
    PlainProfile(PlainProfile&&) = default;
    PlainProfile& operator=(PlainProfile&&) = default;
    PlainProfile(const PlainProfile&) = delete;
    PlainProfile& operator=(const PlainProfile&) = delete;
    ~PlainProfile() {
        for (const Json::Value& member : json) {
            const char* begin = nullptr;
            const char* end = nullptr;
            if (member.isString() && member.getString(&begin, &end)) {
                explicit_bzero(const_cast<char*>(begin), static_cast<size_t>(end - begin));
            }
        }
    }

    Json::Value json;
};

}  // namespace

const Json::Value* StoredProfile(unsigned int uid, const std::string& server_id,
                                 Server::VFS_CONFIG_MODE mode) {
    static thread_local FileMemo<PlainProfile> profiles;
    const auto read = [&](PlainProfile& profile) {
        if (!Server::Get(uid, mode, server_id.c_str(), true, false, profile.json) ||
            !profile.json.isObject()) {
            return false;
        }
        profile.json["server_id"] = server_id;
        return true;
    };
    if (Utils::GetCloudTypeFromURI(server_id) == CLOUD_TYPE_VFS) {
        // Of a file server's connection the mount is part, and no file tells how that is.
        static thread_local PlainProfile read_anew;
        read_anew = PlainProfile();
        return read(read_anew) ? &read_anew.json : nullptr;
    }
    const PlainProfile* profile = profiles.Get(Server::DocumentPath(uid, mode), server_id, read);
    return profile == nullptr ? nullptr : &profile->json;
}

}  // namespace ZYROCloud
