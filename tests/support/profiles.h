/** A user's profile files as unit tests of the server folder set them up and look at them. */
#ifndef ZYROVFS_TESTS_PROFILES_H
#define ZYROVFS_TESTS_PROFILES_H

#include <gtest/gtest.h>
#include <json/writer.h>

#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>

#include "core/json.h"
#include "core/paths.h"
#include "zyrovfs/error.h"
#include "zyrovfs/server.h"

namespace profiles {

using ZYROVFS::Server::VFS_CONFIG_CONNECT;
using ZYROVFS::Server::VFS_CONFIG_MODE;
using ZYROVFS::Server::VFS_CONFIG_SERVER;

inline constexpr unsigned kUser = 1234;

inline std::string Directory(VFS_CONFIG_MODE mode, unsigned uid = kUser) {
    return mode == VFS_CONFIG_SERVER ? ZYROVFS::paths::UserConfigDir(uid)
                                     : ZYROVFS::paths::UserConnectDir(uid);
}

inline std::string File(VFS_CONFIG_MODE mode, unsigned uid = kUser) {
    return Directory(mode, uid) + (mode == VFS_CONFIG_SERVER ? "/servers.conf" : "/connect.conf");
}

inline std::string Text(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

inline void PutText(const std::string& path, const std::string& text) {
    std::filesystem::create_directories(std::filesystem::path(path).parent_path());
    std::ofstream(path, std::ios::binary) << text;
}

/** Puts a document with these profiles in place. */
inline void Put(VFS_CONFIG_MODE mode, const Json::Value& servers, unsigned uid = kUser) {
    Json::Value doc;
    doc["servers"] = servers;
    PutText(File(mode, uid), ZYROVFS::json::toString(doc));
}

/** The profiles that stand in the file, null when it cannot be read. */
inline Json::Value Stored(VFS_CONFIG_MODE mode, unsigned uid = kUser) {
    Json::Value doc;
    ZYROVFS::json::fromString(doc, Text(File(mode, uid)));
    return doc.isObject() ? doc["servers"] : Json::Value();
}

/** A user without files; nobody's daemons are asked. */
class ProfileTest : public testing::Test {
  protected:
    void SetUp() override {
        for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
            std::filesystem::remove_all(Directory(mode));
        }
        setenv("ZYROVFS_UID", std::to_string(kUser).c_str(), 1);
        ZYROVFS::ResetError();
    }
};

}  // namespace profiles

#endif
