/** Simulated clouds as a program, for the demo, benchmarks and clients that cannot link them. */
#include <sys/resource.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <memory>
#include <sstream>
#include <stdexcept>

#include "support/cloudsim/main_service.h"
#include "support/cloudsim/mounted_account.h"
#include "support/test_certs.h"

namespace {

namespace fs = std::filesystem;

const char kUsage[] = R"(cloudsim --box|--dropbox|--google|--onedrive [OPTION]...
cloudsim --make-tls FOLDER [NAME]...    makes ca.pem, cert.pem and key.pem for these names

Serves a simulated cloud on loopback until it is told to end (SIGTERM, SIGINT), and prints how to
reach it, as NAME=VALUE lines, the last of them "ready". Its exit status is 3 when a declared fault
was not used. Hosts are api, upload and download of Box, api and content of Dropbox (a third is
not used), api, accounts and content of Google, api, login and content of OneDrive.

  --tls CERT KEY        PEM files of the server; without, plain HTTP
  --port N              0, the default, takes any
  --address HOST        one name or address for everything (127.0.0.1), instead of
                        localhost and names below it
  --hosts A B C         these names for its three hosts instead
  --account EMAIL       one more account; what follows is about it
    --name NAME           of its user
    --serve FOLDER        what lies there is its tree; changes are made there as well
    --many N SIZE         N files in a folder "many", made of a pattern
    --pattern NAME SIZE   one such file
    --quota BYTES         --max-upload BYTES
    --mount FOLDER        shows its names and ids there, as a mounted backend would
    --mount-top NAME      below a folder of this name there
    --tokens FILE         the pair of tokens that it starts with, written there as JSON
  --client ID:SECRET    of the token endpoint (client:secret unless given)
  --token-life SECONDS  of all tokens given (3600)
  --keep-refresh-tokens they can be used more than once
  --max-offset N        of listings (10000)
  --spool FOLDER        keeps uploads in unnamed files there (in memory unless given)
  --sink                counts and sums up uploads, and keeps nothing of them
  --no-sums             leaves out SHA-1 of bodies and uploads until somebody asks
  --journal FILE        every request as one line of JSON
  --fault TEXT          such as "GET /2.0/users/me after=1 times=2 answer=503 body=busy"; words:
                        host= after= times= answer= status= body= header=NAME:VALUE line= raw=
                        delay= rate= upload-rate= pause=BYTES:SECONDS pause-upload=BYTES:SECONDS
                        cut= cut-upload= close=before|after|effect reset
                        close-after-answer range=ignore|start|short expire-token
)";

struct AccountPlan {
    std::string email, name, served, tokens, mounted, top;
    std::vector<std::pair<std::string, uint64_t>> patterns;
    size_t many = 0;
    uint64_t many_size = 0, quota = 0, max_upload = 0;
};

struct Plan {
    cloudsim::ServiceOptions options;
    std::vector<AccountPlan> accounts;
    std::vector<std::pair<std::string, std::string>> clients;
    std::vector<cloudsim::Fault> faults;
    int64_t token_life = 3600;
    const cloudsim::ServiceKind* kind = nullptr;
    bool rotate = true;
};

std::string ReadAll(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    if (!file) {
        throw std::runtime_error("cannot read " + path);
    }
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

void WriteAll(const fs::path& path, const std::string& text) {
    std::ofstream file(path, std::ios::binary);
    if (!(file << text) || !file.flush()) {
        throw std::runtime_error("cannot write " + path.string());
    }
}

class Arguments {
  public:
    Arguments(int count, char** words) : next_(words + 1), end_(words + count) {}
    bool Empty() const { return next_ == end_; }
    std::string Word() {
        return Empty() ? throw std::invalid_argument("a value is missing at the end") : *next_++;
    }
    uint64_t Number() {
        const std::string word = Word();
        const auto number = cloudsim::ParseNumber(word);
        return number ? *number : throw std::invalid_argument("not a number: " + word);
    }

  private:
    char** next_;
    char** end_;
};

AccountPlan& LastAccount(Plan& plan) {
    return plan.accounts.empty() ? throw std::invalid_argument("--account comes first")
                                 : plan.accounts.back();
}

using Option = std::function<void(Plan&, Arguments&)>;

const std::map<std::string, Option>& ServiceOptions() {
    static const std::map<std::string, Option> options = {
        {"--tls",
         [](Plan& plan, Arguments& in) {
             plan.options.certificate = ReadAll(in.Word());
             plan.options.key = ReadAll(in.Word());
         }},
        {"--port",
         [](Plan& plan, Arguments& in) { plan.options.port = static_cast<int>(in.Number()); }},
        {"--address",
         [](Plan& plan, Arguments& in) {
             const std::string name = in.Word();
             plan.options.names = {name, name, name};
         }},
        {"--hosts",
         [](Plan& plan, Arguments& in) {
             plan.options.names.emplace();
             for (std::string& name : *plan.options.names) {
                 name = in.Word();
             }
         }},
        {"--client",
         [](Plan& plan, Arguments& in) {
             const std::string pair = in.Word();
             const size_t colon = pair.find(':');
             if (colon == std::string::npos) {
                 throw std::invalid_argument("--client ID:SECRET");
             }
             plan.clients.emplace_back(pair.substr(0, colon), pair.substr(colon + 1));
         }},
        {"--token-life",
         [](Plan& plan, Arguments& in) { plan.token_life = static_cast<int64_t>(in.Number()); }},
        {"--keep-refresh-tokens", [](Plan& plan, Arguments&) { plan.rotate = false; }},
        {"--max-offset", [](Plan& plan, Arguments& in) { plan.options.max_offset = in.Number(); }},
        {"--spool",
         [](Plan& plan, Arguments& in) {
             plan.options.storage = {cloudsim::Storage::Kind::kFolder, in.Word()};
         }},
        {"--sink",
         [](Plan& plan, Arguments&) {
             plan.options.storage.kind = cloudsim::Storage::Kind::kCountOnly;
         }},
        {"--no-sums",
         [](Plan& plan, Arguments&) {
             plan.options.journal_hashes = plan.options.hash_uploads = false;
         }},
        {"--journal", [](Plan& plan, Arguments& in) { plan.options.journal_file = in.Word(); }},
        {"--fault",
         [](Plan& plan, Arguments& in) { plan.faults.push_back(cloudsim::ParseFault(in.Word())); }},
    };
    return options;
}

const std::map<std::string, Option>& AccountOptions() {
    static const std::map<std::string, Option> options = {
        {"--account",
         [](Plan& plan, Arguments& in) {
             plan.accounts.emplace_back();
             plan.accounts.back().email = in.Word();
         }},
        {"--name", [](Plan& plan, Arguments& in) { LastAccount(plan).name = in.Word(); }},
        {"--serve", [](Plan& plan, Arguments& in) { LastAccount(plan).served = in.Word(); }},
        {"--mount", [](Plan& plan, Arguments& in) { LastAccount(plan).mounted = in.Word(); }},
        {"--mount-top", [](Plan& plan, Arguments& in) { LastAccount(plan).top = "/" + in.Word(); }},
        {"--tokens", [](Plan& plan, Arguments& in) { LastAccount(plan).tokens = in.Word(); }},
        {"--many",
         [](Plan& plan, Arguments& in) {
             LastAccount(plan).many = in.Number();
             LastAccount(plan).many_size = in.Number();
         }},
        {"--pattern",
         [](Plan& plan, Arguments& in) {
             const std::string name = in.Word();
             LastAccount(plan).patterns.emplace_back(name, in.Number());
         }},
        {"--quota", [](Plan& plan, Arguments& in) { LastAccount(plan).quota = in.Number(); }},
        {"--max-upload",
         [](Plan& plan, Arguments& in) { LastAccount(plan).max_upload = in.Number(); }},
    };
    return options;
}

Plan ReadPlan(Arguments in) {
    Plan plan;
    // Of a long-running server only the file keeps what came.
    plan.options.keep_journal = false;
    while (!in.Empty()) {
        const std::string word = in.Word();
        if (const cloudsim::ServiceKind* kind = cloudsim::FindServiceKind(word)) {
            plan.kind = kind;
            continue;
        }
        auto option = ServiceOptions().find(word);
        if (option == ServiceOptions().end()) {
            option = AccountOptions().find(word);
            if (option == AccountOptions().end()) {
                throw std::invalid_argument("unknown option " + word);
            }
        }
        option->second(plan, in);
    }
    if (plan.kind == nullptr || plan.accounts.empty()) {
        throw std::invalid_argument("a service and at least one --account are needed");
    }
    return plan;
}

void MakeTls(Arguments in) {
    const fs::path folder = in.Word();
    tls::CertSpec spec;
    spec.dns_names = {"localhost", "upload.localhost", "dl.localhost"};
    while (!in.Empty()) {
        spec.dns_names.push_back(in.Word());
    }
    const tls::Identity authority = tls::MakeAuthority("cloudsim test authority");
    const tls::Identity server = tls::Make(spec, &authority);
    fs::create_directories(folder);
    WriteAll(folder / "ca.pem", authority.certificate);
    WriteAll(folder / "cert.pem", server.certificate);
    WriteAll(folder / "key.pem", server.key);
}

void Say(const std::string& name, const std::string& value) {
    std::cout << name << '=' << value << '\n';
}

cloudsim::Account& Fill(cloudsim::Service& service, const AccountPlan& plan, int64_t life) {
    cloudsim::Account& account = service.AddAccount(plan.email, plan.name);
    if (plan.quota != 0) {
        account.SetQuota(plan.quota);
    }
    if (plan.max_upload != 0) {
        account.SetMaxUpload(plan.max_upload);
    }
    if (!plan.served.empty()) {
        account.Serve(plan.served);
    }
    if (plan.many != 0) {
        account.AddMany(account.AddFolder(account.Root(), "many"), plan.many, plan.many_size);
    }
    for (const auto& [name, size] : plan.patterns) {
        account.AddPattern(account.Root(), name, size);
    }
    const cloudsim::Tokens tokens = account.IssueTokens(life);
    Say("account", account.Email());
    Say("access_token", tokens.access_token);
    Say("refresh_token", tokens.refresh_token);
    if (!plan.tokens.empty()) {
        Json::Value document;
        document["email"] = account.Email();
        document["access_token"] = tokens.access_token;
        document["refresh_token"] = tokens.refresh_token;
        document["expire_time"] = Json::Int64(service.Now() + life);
        WriteAll(plan.tokens, cloudsim::OneLine(document) + "\n");
    }
    return account;
}

/** An open descriptor for each file of a served folder. */
void AllowManyFiles() {
    rlimit limit{};
    getrlimit(RLIMIT_NOFILE, &limit);
    limit.rlim_cur = limit.rlim_max;
    setrlimit(RLIMIT_NOFILE, &limit);
}

/** Until a signal ends the program. */
void Wait(const sigset_t& ends, std::vector<std::unique_ptr<cloudsim::MountedAccount>>& mounted) {
    const timespec interval{0, 100000000};
    while (mounted.empty() ? sigwaitinfo(&ends, nullptr) < 0
                           : sigtimedwait(&ends, nullptr, &interval) < 0) {
        for (const auto& account : mounted) {
            try {
                account->Refresh();
            } catch (const std::invalid_argument&) {
                // A client removed what was being looked at; the next look is whole.
            }
        }
    }
}

int Serve(const Plan& plan) {
    sigset_t ends;
    sigemptyset(&ends);
    sigaddset(&ends, SIGTERM);
    sigaddset(&ends, SIGINT);
    pthread_sigmask(SIG_BLOCK, &ends, nullptr);
    AllowManyFiles();

    const cloudsim::Running running = plan.kind->start(plan.options);
    cloudsim::Service& service = *running.service;
    service.SetTokenLife(plan.token_life);
    service.SetRotation(plan.rotate);
    for (const auto& [id, secret] : plan.clients) {
        service.AddClient(id, secret);
    }
    for (const cloudsim::Fault& fault : plan.faults) {
        service.AddFault(fault);
    }
    for (const auto& [use, address] : running.hosts) {
        Say(use, address);
    }
    std::vector<std::unique_ptr<cloudsim::MountedAccount>> mounted;
    for (const AccountPlan& account : plan.accounts) {
        const cloudsim::Account& made = Fill(service, account, plan.token_life);
        if (!account.mounted.empty()) {
            mounted.push_back(std::make_unique<cloudsim::MountedAccount>(
                service, made, account.mounted, account.top));
            mounted.back()->Refresh();
        }
    }
    std::cout << "ready" << std::endl;
    Wait(ends, mounted);
    const std::vector<std::string> unused = service.UnusedFaults();
    for (const std::string& fault : unused) {
        std::cerr << "cloudsim: fault not used: " << fault << '\n';
    }
    return unused.empty() ? 0 : 3;
}

}  // namespace

int main(int count, char** words) {
    try {
        const std::string first = count > 1 ? words[1] : "--help";
        if (first == "--help") {
            std::cout << kUsage;
            return 0;
        }
        if (first == "--make-tls") {
            MakeTls({count - 1, words + 1});
            return 0;
        }
        return Serve(ReadPlan({count, words}));
    } catch (const std::exception& error) {
        std::cerr << "cloudsim: " << error.what() << '\n';
        return 2;
    }
}
