/** Users and groups of the private host, and those that a directory server or a domain adds. */
#ifndef ZYROVFS_TESTS_ACCOUNTS_H
#define ZYROVFS_TESTS_ACCOUNTS_H

#include <dlfcn.h>
#include <gnu/libc-version.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>

#include "support/locations.h"

namespace accounts {

inline std::string Whole(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

inline void Append(const std::string& path, const std::string& line) {
    std::ofstream(path, std::ios::app) << line << '\n';
}

inline std::string UserLine(const std::string& name, unsigned uid, unsigned gid = 100) {
    return name + ":x:" + std::to_string(uid) + ":" + std::to_string(gid) + "::/home:/bin/sh";
}

inline std::string GroupLine(const std::string& name, unsigned gid,
                             const std::string& members = "") {
    return name + ":x:" + std::to_string(gid) + ":" + members;
}

inline void AddUser(const std::string& name, unsigned uid, unsigned gid = 100) {
    Append("/etc/passwd", UserLine(name, uid, gid));
}

inline void AddGroup(const std::string& name, unsigned gid, const std::string& members = "") {
    Append("/etc/group", GroupLine(name, gid, members));
}

/** The files as they were, before and after each test. */
class AccountsTest : public testing::Test {
  protected:
    AccountsTest() {
        // No people and no administrators but those of the test.
        std::ofstream("/etc/passwd") << "root:x:0:0:root:/root:/bin/bash\n"
                                        "daemon:x:1:1:daemon:/usr/sbin:/usr/sbin/nologin\n"
                                        "nobody:x:65534:65534:nobody:/nonexistent:/bin/false\n";
        std::ofstream("/etc/group") << "root:x:0:\ndaemon:x:1:\nsudo:x:27:\nusers:x:100:\n"
                                       "nogroup:x:65534:\n";
        std::ofstream("/etc/nsswitch.conf") << "passwd: files systemd\ngroup: files systemd\n";
    }
    ~AccountsTest() override {
        for (const auto& [path, text] : saved_) {
            std::ofstream(path, std::ios::binary) << text;
        }
    }

  private:
    const std::pair<std::string, std::string> saved_[4] = {
        {"/etc/passwd", Whole("/etc/passwd")},
        {"/etc/group", Whole("/etc/group")},
        {"/etc/nsswitch.conf", Whole("/etc/nsswitch.conf")},
        {"/etc/login.defs", Whole("/etc/login.defs")}};
};

/** Puts the name services "ldap" and "winbind" where the C library finds them, and on duty. */
inline void BindToServices(const std::string& services) {
    // Once: a library that is in use must not be written over.
    static const bool in_place = [] {
        Dl_info libc{};
        dladdr(reinterpret_cast<void*>(&gnu_get_libc_version), &libc);
        const auto folder = std::filesystem::path(libc.dli_fname).parent_path();
        for (const char* name : {"libnss_ldap.so.2", "libnss_winbind.so.2"}) {
            std::filesystem::remove(folder / name);
            std::filesystem::copy_file(BuildDir() + "/tests/" + name, folder / name);
        }
        return true;
    }();
    ASSERT_TRUE(in_place);
    std::ofstream("/etc/nsswitch.conf") << "passwd: files " << services << "\n"
                                        << "group: files " << services << "\n";
}

}  // namespace accounts

#endif
