/**
 * Memory that runs out: a program that includes this in its one source file defines the platform's
 * allocation of hashes and lists itself, which fails while the flag is set.
 */
#ifndef ZYROVFS_TESTS_FAILING_ALLOC_H
#define ZYROVFS_TESTS_FAILING_ALLOC_H

#include <dlfcn.h>
#include <zosplatform/error.h>
#include <zosplatform/text.h>

namespace failing_alloc {

inline bool no_hash = false;
inline bool no_list = false;

template <typename Handle>
Handle Alloc(const char* function, bool fail, int size) {
    if (fail) {
        YLIBCErrSetEx(ZOS_ERR_OUT_OF_MEMORY, "heap.cpp", 12);
        return nullptr;
    }
    return reinterpret_cast<Handle (*)(int)>(dlsym(RTLD_NEXT, function))(size);
}

}  // namespace failing_alloc

extern "C" PYLIBCSZHASH YLIBCSzHashAlloc(int size) {
    return failing_alloc::Alloc<PYLIBCSZHASH>("YLIBCSzHashAlloc", failing_alloc::no_hash, size);
}

extern "C" PYLIBCSZLIST YLIBCSzListAlloc(int size) {
    return failing_alloc::Alloc<PYLIBCSZLIST>("YLIBCSzListAlloc", failing_alloc::no_list, size);
}

#endif
