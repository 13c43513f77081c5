#include "zyrovfs/zyrocloud.h"

void InitRootAtime(ZYROCloud_RootAtime* rec) {
    if (rec == nullptr) {
        return;
    }
    g_rec_mutex_init(&rec->mutex);
    UpdateRootAtime(rec);
}

void UpdateRootAtime(ZYROCloud_RootAtime* rec) {
    if (rec == nullptr) {
        return;
    }
    g_rec_mutex_lock(&rec->mutex);
    rec->atime = time(nullptr);
    g_rec_mutex_unlock(&rec->mutex);
}

time_t GetRootAtime(ZYROCloud_RootAtime* rec) {
    if (rec == nullptr) {
        return 0;
    }
    g_rec_mutex_lock(&rec->mutex);
    const time_t atime = rec->atime;
    g_rec_mutex_unlock(&rec->mutex);
    return atime;
}

void DestroyRootAtime(ZYROCloud_RootAtime* rec) {
    if (rec != nullptr) {
        g_rec_mutex_clear(&rec->mutex);
    }
}
