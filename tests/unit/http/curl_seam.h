/**
 * What a handler asks of libcurl, on record: a program that includes this in its one source file
 * defines the three functions itself. They pass everything on, except for what a test planned.
 */
#ifndef ZYROVFS_TESTS_CURL_SEAM_H
#define ZYROVFS_TESTS_CURL_SEAM_H

#include <curl/curl.h>
#include <dlfcn.h>

#include <cstdarg>
#include <deque>
#include <map>
#include <utility>
#include <vector>

namespace curl_seam {

struct Call {
    int option;  ///< kPerform for a transfer
    long value;  ///< pointers as numbers
};
constexpr int kPerform = -1;

struct State {
    std::vector<Call> calls;
    std::map<int, CURLcode> refused;  ///< options that libcurl does not take
    std::map<int, long> replaced;     ///< options that get another value
    std::deque<CURLcode> results;     ///< of the next transfers, which then are not made
    bool no_handle = false;
};

inline State& Now() {
    static State state;
    return state;
}

/** Values that an option was given, in order. */
inline std::vector<long> Values(int option) {
    std::vector<long> values;
    for (const Call& call : Now().calls) {
        if (call.option == option) {
            values.push_back(call.value);
        }
    }
    return values;
}

/** What this option was given, with a 0 in the place of each transfer. */
inline std::vector<long> AmongTransfers(int option) {
    std::vector<long> values;
    for (const Call& call : Now().calls) {
        if (call.option == option || call.option == kPerform) {
            values.push_back(call.option == kPerform ? 0 : call.value);
        }
    }
    return values;
}

template <typename Function>
Function Real(const char* name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

}  // namespace curl_seam

#undef curl_easy_setopt
extern "C" CURLcode curl_easy_setopt(CURL* curl, CURLoption option, ...) {
    static const auto real =
        curl_seam::Real<CURLcode (*)(CURL*, CURLoption, ...)>("curl_easy_setopt");
    va_list args;
    va_start(args, option);
    long value = va_arg(args, long);  // pointers and numbers are passed alike
    va_end(args);
    curl_seam::State& state = curl_seam::Now();
    state.calls.push_back({option, value});
    const auto refused = state.refused.find(option);
    if (refused != state.refused.end()) {
        return refused->second;
    }
    const auto replaced = state.replaced.find(option);
    return real(curl, option, replaced == state.replaced.end() ? value : replaced->second);
}

extern "C" CURLcode curl_easy_perform(CURL* curl) {
    static const auto real = curl_seam::Real<CURLcode (*)(CURL*)>("curl_easy_perform");
    curl_seam::State& state = curl_seam::Now();
    state.calls.push_back({curl_seam::kPerform, 0});
    if (state.results.empty()) {
        return real(curl);
    }
    const CURLcode result = state.results.front();
    state.results.pop_front();
    return result;
}

extern "C" CURL* curl_easy_init() {
    static const auto real = curl_seam::Real<CURL* (*)()>("curl_easy_init");
    return curl_seam::Now().no_handle ? nullptr : real();
}

#endif
