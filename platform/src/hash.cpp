#include "containers.h"
#include "support.h"

PYLIBCSZHASH YLIBCSzHashAlloc(int) {
    auto* hash = new (std::nothrow) _tag_YLIBCSZHASH_;
    if (hash == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_OUT_OF_MEMORY);
    }
    return hash;
}

void YLIBCSzHashFree(PYLIBCSZHASH hash) {
    delete hash;
}

int YLIBCSzHashSetValue(PYLIBCSZHASH* hash, const char* key, const char* value) {
    if (hash == nullptr || *hash == nullptr || key == nullptr || value == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return -1;
    }
    return zos::OrOutOfMemory(-1, [&] {
        (*hash)->values.insert_or_assign(std::string(key), std::string(value));
        return 0;
    });
}

const char* YLIBCSzHashGetValue(const PYLIBCSZHASH hash, const char* key) {
    if (hash == nullptr || key == nullptr) {
        return nullptr;
    }
    const auto found = hash->values.find(std::string_view(key));
    return found == hash->values.end() ? nullptr : found->second.c_str();
}
