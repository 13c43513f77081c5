/** libsoup out of memory, as a test program that includes this header can have it. Once a program.
 */
#ifndef ZYROVFS_TESTS_SOUP_SEAM_H
#define ZYROVFS_TESTS_SOUP_SEAM_H

#include <dlfcn.h>
#include <libsoup/soup.h>
#include <unistd.h>

namespace soup_seam {

/** soup_uri_new answers null behind so many calls, -1 never. Forked children are not meant. */
inline int fail_new_after = -1;
/** soup_uri_to_string answers null. */
inline bool fail_to_string = false;

inline const pid_t kProcess = getpid();

inline void Reset() {
    fail_new_after = -1;
    fail_to_string = false;
}

template <typename F>
F Real(F, const char* name) {
    return reinterpret_cast<F>(dlsym(RTLD_NEXT, name));
}

}  // namespace soup_seam

extern "C" {

SoupURI* soup_uri_new(const char* text) {
    if (soup_seam::fail_new_after >= 0 && getpid() == soup_seam::kProcess) {
        if (soup_seam::fail_new_after == 0) {
            return nullptr;
        }
        --soup_seam::fail_new_after;
    }
    return soup_seam::Real(&soup_uri_new, "soup_uri_new")(text);
}

char* soup_uri_to_string(SoupURI* uri, gboolean just_path_and_query) {
    return soup_seam::fail_to_string ? nullptr
                                     : soup_seam::Real(&soup_uri_to_string, "soup_uri_to_string")(
                                           uri, just_path_and_query);
}

}  // extern "C"

#endif
