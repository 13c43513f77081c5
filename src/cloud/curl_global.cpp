#include <curl/curl.h>
#include <openssl/crypto.h>
#include <pthread.h>

#include <iterator>
#include <new>

#include "cloud/handler.h"
#include "core/log.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

using namespace ZYROVFS;

void* Cloud::_gShare_handle = nullptr;
void* Cloud::_glockarray = nullptr;
bool Cloud::_gblInitCurlGlobal = false;

namespace {

/** False once the share is gone: the pointer to it stays where callers have always found it, but no
 * handler may get it any more. */
bool share_lives = false;

/** libcurl counts its kinds of shared data; 0 is unused, and the last one is the number of them. */
pthread_mutex_t share_mutexes[CURL_LOCK_DATA_LAST];

void LockShared(CURL*, curl_lock_data data, curl_lock_access, void*) {
    pthread_mutex_lock(&share_mutexes[data]);
}

void UnlockShared(CURL*, curl_lock_data data, void*) {
    pthread_mutex_unlock(&share_mutexes[data]);
}

/**
 * A copy from cloud to cloud has a handle at work in each of two threads. Without lock functions
 * libcurl touches the common store unguarded, and the first name that both look up at once can ruin
 * the heap; so there are locks, whatever was asked of this share in the days of one thread.
 */
void MakeShare() {
    for (pthread_mutex_t& mutex : share_mutexes) {
        mutex = PTHREAD_MUTEX_INITIALIZER;
    }
    CURLSH* share = curl_share_init();
    if (share == nullptr) {
        LOG_ERROR("Failed to make the share of libcurl");
        return;
    }
    curl_share_setopt(share, CURLSHOPT_LOCKFUNC, LockShared);
    curl_share_setopt(share, CURLSHOPT_UNLOCKFUNC, UnlockShared);
    curl_share_setopt(share, CURLSHOPT_SHARE, CURL_LOCK_DATA_DNS);
    curl_share_setopt(share, CURLSHOPT_SHARE, CURL_LOCK_DATA_SSL_SESSION);
    Cloud::_gShare_handle = share;
    share_lives = true;
}

int CryptoLocks() {
    return CRYPTO_num_locks();
}

pthread_mutex_t* LockArray() {
    return static_cast<pthread_mutex_t*>(Cloud::_glockarray);
}

void MakeCryptoLocks() {
    Cloud::_glockarray = new (std::nothrow) pthread_mutex_t[CryptoLocks()];
    for (int i = 0; Cloud::_glockarray != nullptr && i < CryptoLocks(); ++i) {
        pthread_mutex_init(&LockArray()[i], nullptr);
    }
}

void DropCryptoLocks() {
    for (int i = 0; Cloud::_glockarray != nullptr && i < CryptoLocks(); ++i) {
        pthread_mutex_destroy(&LockArray()[i]);
    }
    delete[] LockArray();
    Cloud::_glockarray = nullptr;
}

#if OPENSSL_VERSION_NUMBER < 0x10100000L

unsigned long CryptoThread() {
    return static_cast<unsigned long>(pthread_self());
}

void CryptoLock(int mode, int n, const char*, int) {
    if ((mode & CRYPTO_LOCK) != 0) {
        pthread_mutex_lock(&LockArray()[n]);
    } else {
        pthread_mutex_unlock(&LockArray()[n]);
    }
}

void InstallCryptoLocks() {
    if (Cloud::_glockarray != nullptr) {
        CRYPTO_set_id_callback(CryptoThread);
        CRYPTO_set_locking_callback(CryptoLock);
    }
}

void RemoveCryptoLocks() {
    CRYPTO_set_locking_callback(nullptr);
}

#else

// From 1.1 on OpenSSL locks by itself and has no use for callbacks.
void InstallCryptoLocks() {}
void RemoveCryptoLocks() {}

#endif

}  // namespace

CURLSH* LiveShare() noexcept {
    return share_lives ? Cloud::_gShare_handle : nullptr;
}

void Cloud::InitCurlGlobal() {
    if (_gblInitCurlGlobal) {
        return;
    }
    curl_global_init(CURL_GLOBAL_ALL);
    if (_gShare_handle == nullptr) {
        MakeShare();
    }
    MakeCryptoLocks();
    InstallCryptoLocks();
    _gblInitCurlGlobal = true;
}

void Cloud::CleanupCurlGlobal() {
    if (!_gblInitCurlGlobal) {
        return;
    }
    HandlePool::Instance().Empty();
    curl_global_cleanup();
    // A share that drivers still hold is not taken from them.
    if (share_lives && curl_share_cleanup(_gShare_handle) == CURLSHE_OK) {
        share_lives = false;
    }
    RemoveCryptoLocks();
    DropCryptoLocks();
    _gblInitCurlGlobal = false;
}

}  // namespace ZYROCloud
