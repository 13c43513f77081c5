/**
 * libcurl's waits at a test's pace: a program that includes this in its one source file defines
 * curl_easy_setopt itself, which passes everything on but the waits while `shortened_waits` is set.
 */
#ifndef ZYROVFS_TESTS_SHORTENED_WAITS_H
#define ZYROVFS_TESTS_SHORTENED_WAITS_H

#include <curl/curl.h>
#include <dlfcn.h>

#include <cstdarg>

inline bool shortened_waits = false;

#undef curl_easy_setopt
extern "C" CURLcode curl_easy_setopt(CURL* curl, CURLoption option, ...) {
    using Real = CURLcode (*)(CURL*, CURLoption, ...);
    static const Real real = reinterpret_cast<Real>(dlsym(RTLD_NEXT, "curl_easy_setopt"));
    va_list args;
    va_start(args, option);
    const long value = va_arg(args, long);  // pointers and numbers are passed alike
    va_end(args);
    if (shortened_waits && (option == CURLOPT_CONNECTTIMEOUT || option == CURLOPT_LOW_SPEED_TIME)) {
        return real(curl, option, 1L);
    }
    return real(curl, option, value);
}

#endif
