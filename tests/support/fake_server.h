/**
 * A server type without a remote side. ServerMgr gives it out for every protocol while a
 * fake::Scope lives; it validates, stores and mounts as the real ones do, does what the test
 * planned, and records what it was asked.
 */
#ifndef ZYROVFS_TESTS_FAKE_SERVER_H
#define ZYROVFS_TESTS_FAKE_SERVER_H

#include <unistd.h>

#include <deque>
#include <map>
#include <memory>
#include <numeric>
#include <string>
#include <vector>

#include "server/server_factory.h"
#include "support/seams.h"
#include "zyrovfs/error.h"

namespace fake {

using ZYROVFS::__tag_vfs_err_;
using ZYROVFS::Server::VFS_CONFIG_MODE;

/** One operation as it was asked. */
struct Call {
    std::string operation;
    VFS_CONFIG_MODE mode;
    Json::Value conf;     ///< Load, Mount, IsUpdateNeedsRemount
    bool flag = false;    ///< decrypt of Load, force of Mount, encrypt of CreateJsonObj
    bool online = false;  ///< of Load
    unsigned waited = 0;  ///< seconds slept until then
    uid_t effective_uid = 0;
};

/** Result of one operation: a failure with this code, or success for VFS_ERR_NONE. */
using Outcomes = std::deque<__tag_vfs_err_>;

struct Plan {
    std::vector<Call> calls;
    /** What the next calls of an operation do; success when nothing is planned any more. */
    std::map<std::string, Outcomes> outcomes;
    int alive = 0;  ///< objects
};

inline Plan& Now() {
    static Plan plan;
    return plan;
}

inline void Fail(const std::string& operation, Outcomes outcomes) {
    Now().outcomes[operation] = std::move(outcomes);
}

/** Names of the recorded operations, in order. */
inline std::vector<std::string> Operations() {
    std::vector<std::string> names;
    for (const Call& call : Now().calls) {
        names.push_back(call.operation);
    }
    return names;
}

/** The calls of one operation, in order. */
inline std::vector<Call> Calls(const std::string& operation) {
    std::vector<Call> found;
    for (const Call& call : Now().calls) {
        if (call.operation == operation) {
            found.push_back(call);
        }
    }
    return found;
}

/** The cipher that the fake uses for its password. */
inline std::string Sealed(const std::string& text) {
    return "sealed:" + text;
}

class FakeServer : public ZYROVFS::Server::ServerBase {
  public:
    FakeServer() { ++Now().alive; }
    ~FakeServer() override { --Now().alive; }

    bool Load(unsigned uid, VFS_CONFIG_MODE mode, Json::Value conf, bool decrypt,
              bool online) override {
        if (!Done({"Load", mode, conf, decrypt, online})) {
            return false;
        }
        for (const char* key : {"protocol", "hostname", "alias"}) {
            if (!conf.isMember(key)) {
                ZYROVFS::VFSSetErrEx(ZYROVFS::VFS_ERR_BAD_PARAM, "fake", 1);
                return false;
            }
        }
        if (decrypt) {
            DecryptCredentials(uid, mode, conf);
        }
        conf_ = conf;
        connect_status_ = GetConnectStatus(uid);
        return true;
    }

    bool GetServerID(std::string& id) override {
        if (!Done({"GetServerID", {}, {}})) {
            return false;
        }
        id = Id();
        return true;
    }

    bool CreateJsonObj(unsigned, VFS_CONFIG_MODE mode, Json::Value& out, bool encrypt) override {
        if (!Done({"CreateJsonObj", mode, {}, encrypt})) {
            return false;
        }
        out = conf_;
        const std::string password = conf_["password"].asString();
        out["password"] = encrypt ? Sealed(password) : password;
        out["path"] = mode == ZYROVFS::Server::VFS_CONFIG_CONNECT ? "/tmp" : "";
        return true;
    }

    bool DecryptCredentials(unsigned, VFS_CONFIG_MODE mode, Json::Value& conf) override {
        if (!Done({"DecryptCredentials", mode, conf})) {
            return false;
        }
        const std::string text = conf["password"].asString(), seal = Sealed("");
        if (text.compare(0, seal.size(), seal) == 0) {
            conf["password"] = text.substr(seal.size());
        }
        return true;
    }

    bool RemoveCredentials(unsigned, VFS_CONFIG_MODE mode, Json::Value& conf) override {
        conf.removeMember("password");
        return Done({"RemoveCredentials", mode, {}});
    }

    bool DeletePostProcess(unsigned, VFS_CONFIG_MODE mode) override {
        return Done({"DeletePostProcess", mode, {}});
    }

    bool DumpToStruct(unsigned, VFS_CONFIG_MODE mode,
                      ZYROVFS::Server::_tag_VFS_CONFIG_INFO_& info) override {
        if (!Done({"DumpToStruct", mode, {}})) {
            return false;
        }
        info.protocol = conf_["protocol"].asString();
        info.hostname = conf_["hostname"].asString();
        info.port = conf_.get("port", 0).asUInt();
        info.alias = conf_["alias"].asString();
        info.account = conf_["account"].asString();
        info.codepage = conf_["codepage"].asString();
        info.uri_path = conf_["uri_path"].asString();
        info.uri = info.protocol + "://" + info.hostname;
        info.connect_status = connect_status_;
        return true;
    }

    bool IsUpdateNeedsRemount(unsigned, VFS_CONFIG_MODE mode, const Json::Value& changes) override {
        Done({"IsUpdateNeedsRemount", mode, changes});
        return changes.isMember("hostname") || changes.isMember("password");
    }

    bool Mount(unsigned, VFS_CONFIG_MODE mode, const Json::Value& conf, bool force) override {
        return Done({"Mount", mode, conf, force});
    }

    bool Unmount(unsigned, VFS_CONFIG_MODE mode) override { return Done({"Unmount", mode, {}}); }

  private:
    std::string Id() const {
        const std::string account = conf_["account"].asString();
        return conf_["protocol"].asString() + "://" + account + (account.empty() ? "" : "@") +
               conf_["hostname"].asString();
    }

    static bool Done(Call call) {
        const std::vector<unsigned> sleeps = seams::Sleeps();
        call.waited = std::accumulate(sleeps.begin(), sleeps.end(), 0U);
        call.effective_uid = geteuid();
        Outcomes& outcomes = Now().outcomes[call.operation];
        Now().calls.push_back(std::move(call));
        if (outcomes.empty()) {
            return true;
        }
        const __tag_vfs_err_ outcome = outcomes.front();
        outcomes.pop_front();
        if (outcome != ZYROVFS::VFS_ERR_NONE) {
            ZYROVFS::VFSSetErrEx(outcome, "fake", 1);
        }
        return outcome == ZYROVFS::VFS_ERR_NONE;
    }

    Json::Value conf_;
};

/** From here on until its end, ServerMgr gives out fakes. */
class Scope {
  public:
    Scope() {
        Now() = Plan();
        ZYROVFS::Server::server_factory = [](const std::string&) {
            return std::unique_ptr<ZYROVFS::Server::ServerBase>(new FakeServer);
        };
    }
    Scope(const Scope&) = delete;
    Scope& operator=(const Scope&) = delete;
    ~Scope() { ZYROVFS::Server::server_factory = ZYROVFS::Server::NewServer; }
};

}  // namespace fake

#endif
