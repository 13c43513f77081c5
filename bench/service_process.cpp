#include "service_process.h"

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <vector>

namespace bench {

void Fail(const std::string& what) {
    std::fprintf(stderr, "failed: %s\n", what.c_str());
    std::exit(1);
}

ServiceProcess::ServiceProcess(const Service& service,
                               const std::function<void(cloudsim::Account&)>& prepare) {
    int tell[2];
    if (pipe(tell) != 0) {
        Fail("pipe");
    }
    child_ = fork();
    if (child_ == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        const Simulated simulated(service);
        if (prepare != nullptr) {
            prepare(*simulated.amy);
        }
        const Access made = simulated.Grant();
        std::string text = made.token + "\n" + made.account + "\n";
        for (const auto& [use, address] : made.hosts) {
            text += use;
            text += "\n" + address + "\n";
        }
        if (write(tell[1], text.data(), text.size()) < 0) {
            _exit(1);
        }
        close(tell[1]);
        for (;;) {
            pause();
        }
    }
    close(tell[1]);
    Take(fdopen(tell[0], "r"));
}

ServiceProcess::~ServiceProcess() {
    kill(child_, SIGKILL);
    waitpid(child_, nullptr, 0);
}

void ServiceProcess::Take(std::FILE* from) {
    char line[1024];
    std::vector<std::string> lines;
    while (std::fgets(line, sizeof line, from) != nullptr) {
        lines.emplace_back(line);
        lines.back().pop_back();
    }
    std::fclose(from);
    if (lines.size() < 4) {
        Fail("service");
    }
    access.token = lines[0];
    access.account = lines[1];
    for (size_t i = 2; i + 1 < lines.size(); i += 2) {
        access.hosts[lines[i]] = lines[i + 1];
    }
}

}  // namespace bench
