// The access policy on a machine with 10,000 users: a page of the settings list against getent and
// grep, and the check of one user for each rule that may decide, against the lookups that the first
// rule (is it an administrator?) cannot do without.
#include <benchmark/benchmark.h>
#include <grp.h>
#include <pwd.h>

#include <cstdio>
#include <fstream>
#include <string>
#include <vector>

#include "zyrovfs/cfg.h"

namespace {

using namespace ZYROVFS::Cfg;

constexpr int kUsers = 10000;
constexpr unsigned kFirst = 10000;
constexpr unsigned kChief = kFirst + 5000;
constexpr unsigned kRefused = 1025;
constexpr unsigned kEnabled = kFirst + 4000;
constexpr unsigned kByGroup = kFirst + 6000;
constexpr unsigned kNotEnabled = kFirst + 7000;

/** Users, one administrator, one enabled group, and settings for a hundred users. */
bool MakeMachine() {
    std::ofstream passwd("/etc/passwd", std::ios::app);
    for (int i = 0; i < kUsers; ++i) {
        passwd << "person" << i << ":x:" << kFirst + i << ":100::/home:/bin/sh\n";
    }
    passwd << "sierra:x:" << kRefused << ":100::/home:/bin/sh\n";
    std::ofstream("/etc/group", std::ios::app)
        << "administrators:x:1600:person5000\npainters:x:1601:person6000\n";
    std::ofstream policy("/usr/zyro/etc/zyrovfs/user.conf");
    policy << R"({"user_enabled_type":"custom","group_settings":{"1601":{"enabled":true}},)"
           << R"("user_settings":{")" << kEnabled << R"(":{"enabled":true})";
    for (int i = 0; i < 99; ++i) {
        policy << ",\"" << kFirst + i << R"(":{"enabled":false})";
    }
    policy << "}}";
    return passwd.good() && policy.good();
}

const bool kMade = MakeMachine();

void ListPage(benchmark::State& state) {
    for (auto _ : state) {
        Json::Value out;
        if (!kMade || !VFSUser().List(100, 50, "local", "SON5", "", false, false, out) ||
            out["usergrp_settings"].size() != 50 || out["total"].asInt() != 1111) {
            state.SkipWithError("not listed");
        }
    }
}

void ListPage_bare(benchmark::State& state) {
    for (auto _ : state) {
        FILE* pipe = popen("getent passwd | grep -i '^[^:]*SON5' | sed -n '101,150p'", "r");
        char line[256];
        int lines = 0;
        while (fgets(line, sizeof line, pipe) != nullptr) {
            ++lines;
        }
        if (pclose(pipe) != 0 || lines != 50) {
            state.SkipWithError("not listed");
        }
    }
}

void Check(benchmark::State& state, unsigned uid, unsigned flags, const char* protocol,
           PERMISSION_RULE rule) {
    if (ExplainPermission(uid, {flags}, protocol).rule != rule) {
        state.SkipWithError("another rule decided");
    }
    for (auto _ : state) {
        benchmark::DoNotOptimize(CheckPermissionByUID(uid, {flags}, protocol));
    }
}

void Check_bare(benchmark::State& state, unsigned uid) {
    for (auto _ : state) {
        const passwd* user = getpwuid(uid);
        gid_t groups[64];
        int count = 64;
        if (user == nullptr || getgrnam("administrators") == nullptr ||
            getgrouplist(user->pw_name, user->pw_gid, groups, &count) < 0) {
            state.SkipWithError("not found");
        }
    }
}

}  // namespace

BENCHMARK(ListPage)->UseRealTime();
BENCHMARK(ListPage_bare)->UseRealTime();

#define CHECK(name, uid, flags, protocol, rule)                 \
    BENCHMARK_CAPTURE(Check, name, uid, flags, protocol, rule); \
    BENCHMARK_CAPTURE(Check_bare, name, uid)

CHECK(administrator, kChief, 1, nullptr, PERMISSION_ADMINISTRATOR);
CHECK(refused_uid, kRefused, 1, nullptr, PERMISSION_REFUSED_UID);
CHECK(sharing, kNotEnabled, 1, "sharing", PERMISSION_SHARING);
CHECK(not_consulted, kNotEnabled, 0, nullptr, PERMISSION_NOT_CONSULTED);
CHECK(user_enabled, kEnabled, 1, nullptr, PERMISSION_USER_ENABLED);
CHECK(group_enabled, kByGroup, 1, nullptr, PERMISSION_GROUP_ENABLED);
CHECK(not_enabled, kNotEnabled, 1, nullptr, PERMISSION_NOT_ENABLED);
