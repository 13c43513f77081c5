// Saves an FTP profile for a user, connects it, and says where its files are.
//
//   example UID HOST PORT ACCOUNT   (password on standard input)
//
// To be run as root: the library becomes the user for what the user has to do.
#include <zyrovfs/zyrovfs_netdrive.h>

#include <cstdlib>
#include <iostream>

namespace {

int Failed(const char* step) {
    const auto code = ZYROVFS::GetError();
    std::cerr << step << ": " << ZYROVFS::GetErrorName(code) << " (" << code
              << "): " << ZYROVFS::GetErrorMeaning(code) << '\n';
    return 1;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 5) {
        std::cerr << "usage: example UID HOST PORT ACCOUNT\n";
        return 2;
    }
    namespace Server = ZYROVFS::Server;
    const unsigned uid = std::strtoul(argv[1], nullptr, 10);

    Json::Value profile;
    profile["protocol"] = "ftp";
    profile["hostname"] = argv[2];
    profile["port"] = static_cast<Json::UInt>(std::strtoul(argv[3], nullptr, 10));
    profile["account"] = argv[4];
    profile["alias"] = "My server";
    profile["codepage"] = "UTF-8";
    std::string password;
    std::getline(std::cin, password);
    profile["password"] = password;

    // Saving only writes the profile; the id is worked out from it.
    std::string id;
    Json::Value stored;
    if (!Server::Add(uid, Server::VFS_CONFIG_SERVER, id, profile, false, stored)) {
        return Failed("save");
    }

    // With an id and no profile, the saved profile is mounted.
    Json::Value connection;
    if (!Server::Add(uid, Server::VFS_CONFIG_CONNECT, id, Json::Value(), false, connection)) {
        return Failed("connect");
    }
    std::cout << id << " is at " << connection["path"].asString() << '\n';

    // Deleting a connection unmounts it; the saved profile goes by a delete of its own.
    if (!Server::Delete(uid, Server::VFS_CONFIG_CONNECT, id.c_str()) ||
        !Server::Delete(uid, Server::VFS_CONFIG_SERVER, id.c_str())) {
        return Failed("delete");
    }
    return 0;
}
