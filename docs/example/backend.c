/*
 * Plays the part of a gvfs backend for one file of a mounted cloud: checks the account, lists the
 * top folder, reads the file to its end, gives it another name, deletes it.
 *
 *   backend SERVICE SERVER_ID NAME <CREDENTIALS >CONTENT
 *
 * SERVICE is box, dropbox, google or onedrive. CREDENTIALS is the JSON document that a mount hands
 * to its backend. The connection is that of the effective user, or of ZYROVFS_UID for root. What
 * becomes of each step is told on standard error.
 */
#include <zyrovfs/zyrocloud.h>

#include <stdio.h>
#include <stdlib.h>
#include <string.h>

/* The bytes that a backend asks for at once; a real one fills the whole buffer of its handle. */
enum { PIECE = 65536, MOST_CREDENTIALS = 65536 };

struct session {
    const struct service* service;
    const char* server_id;
    ZYROCloud_Cache* cache;
    char* account_id; /* of Box */
    int err;          /* of the last operation, a value of GIOErrorEnum */
};

struct service {
    const char* name;
    const char* top; /* the folder that the account's root is shown as */
    int (*check)(struct session*, const char* credentials);
    int (*list)(struct session*, const char* path, ZYROCloud_ListCallback, void* user_data);
    long long (*download)(struct session*, ZYROCloud_Handle*, char** dest, long long size);
};

/* --- what differs from service to service ------------------------------------------------------
 */

static int box_check(struct session* s, const char* credentials) {
    return ZYROCloud_Cloud_Box_CheckAccount(s->server_id, credentials, &s->account_id, &s->err);
}

static int box_list(struct session* s, const char* path, ZYROCloud_ListCallback callback,
                    void* user_data) {
    return ZYROCloud_Cloud_Box_List(s->account_id, s->server_id, s->cache, path, NULL, callback,
                                    user_data, &s->err);
}

static long long box_download(struct session* s, ZYROCloud_Handle* handle, char** dest,
                              long long size) {
    return ZYROCloud_Cloud_Box_Download(handle, s, s, dest, size, &s->err);
}

static int dropbox_check(struct session* s, const char* credentials) {
    return ZYROCloud_Cloud_Dropbox_CheckAccount(s->server_id, credentials, &s->err);
}

static int dropbox_list(struct session* s, const char* path, ZYROCloud_ListCallback callback,
                        void* user_data) {
    return ZYROCloud_Cloud_Dropbox_List(s->server_id, s->cache, path, callback, user_data, &s->err);
}

static long long dropbox_download(struct session* s, ZYROCloud_Handle* handle, char** dest,
                                  long long size) {
    return ZYROCloud_Cloud_Dropbox_Download(handle, s->server_id, s, dest, size, &s->err);
}

static int google_check(struct session* s, const char* credentials) {
    return ZYROCloud_Cloud_Google_CheckAccount(s->server_id, credentials, &s->err);
}

static int google_list(struct session* s, const char* path, ZYROCloud_ListCallback callback,
                       void* user_data) {
    return ZYROCloud_Cloud_Google_List(s->server_id, s->cache, path, NULL, callback, user_data,
                                       &s->err);
}

static long long google_download(struct session* s, ZYROCloud_Handle* handle, char** dest,
                                 long long size) {
    return ZYROCloud_Cloud_Google_Download(handle, s, s, dest, size, &s->err);
}

static int onedrive_check(struct session* s, const char* credentials) {
    return ZYROCloud_Cloud_OneDrive_CheckAccount(s->server_id, credentials, &s->err);
}

static int onedrive_list(struct session* s, const char* path, ZYROCloud_ListCallback callback,
                         void* user_data) {
    return ZYROCloud_Cloud_OneDrive_List(s->server_id, s->cache, path, NULL, callback, user_data,
                                         &s->err);
}

static long long onedrive_download(struct session* s, ZYROCloud_Handle* handle, char** dest,
                                   long long size) {
    return ZYROCloud_Cloud_OneDrive_Download(handle, s, s, dest, size, &s->err);
}

static const struct service services[] = {
    {"box", "/", box_check, box_list, box_download},
    {"dropbox", "/", dropbox_check, dropbox_list, dropbox_download},
    {"google", "/My Drive", google_check, google_list, google_download},
    {"onedrive", "/", onedrive_check, onedrive_list, onedrive_download},
};

/* --- what is the same --------------------------------------------------------------------------
 */

static int failed(const struct session* s, const char* step) {
    fprintf(stderr, "%s: failed, GIO error %d\n", step, s->err);
    return 0;
}

static void tell(GFileInfo* info, void* user_data) {
    const int folder = g_file_info_get_file_type(info) == G_FILE_TYPE_DIRECTORY;
    (void)user_data;
    fprintf(stderr, "  %s%s\n", g_file_info_get_name(info), folder ? "/" : "");
}

static int list(struct session* s) {
    fprintf(stderr, "%s has\n", s->service->top);
    return s->service->list(s, s->service->top, tell, NULL) || failed(s, "list");
}

/* A copy of what the cache knows of a file in the top folder, or NULL. */
static GFileInfo* find(struct session* s, const char* name) {
    const char* const slash = strcmp(s->service->top, "/") == 0 ? "" : "/";
    char* const path = g_strconcat(s->service->top, slash, name, NULL);
    GFileInfo* info = NULL;
    ZYROCloud_Cache_Lock(&s->cache);
    if (ZYROCloud_Cache_Entry_Get(s->cache, path, &info)) {
        info = g_file_info_dup(info);
    }
    ZYROCloud_Cache_Unlock(&s->cache);
    g_free(path);
    if (info == NULL) {
        fprintf(stderr, "%s: not there\n", name);
    }
    return info;
}

/* What the service calls an item. */
static const char* id_of(GFileInfo* info) {
    return g_file_info_get_attribute_string(info, "id::file");
}

static int copy_out(struct session* s, ZYROCloud_Handle* handle) {
    static char piece[PIECE + 1]; /* one byte more than is asked for */
    char* dest = piece;
    long long all = 0;
    long long got = 0;
    while ((got = s->service->download(s, handle, &dest, PIECE)) > 0) {
        fwrite(piece, 1, (size_t)got, stdout);
        all += got;
    }
    fprintf(stderr, "read %lld bytes\n", all);
    return got == 0 && fflush(stdout) == 0;
}

static int read_to_end(struct session* s, const char* name) {
    GFileInfo* const info = find(s, name);
    ZYROCloud_Handle* handle = NULL;
    int good = 0;
    if (info == NULL) {
        return 0;
    }
    handle = ZYROCloud_Cloud_Handle_New(s->server_id, id_of(info), info);
    if (handle != NULL) {
        good = copy_out(s, handle) || failed(s, "read");
        ZYROCloud_Cloud_Handle_Free(handle, NULL);
    }
    g_object_unref(info);
    return good;
}

static int give_name(struct session* s, const char* name, const char* new_name) {
    GFileInfo* const info = find(s, name);
    int good = 0;
    if (info != NULL) {
        good = ZYROCloud_Cloud_Rename(s->server_id, s, id_of(info), new_name, &s->err) ||
               failed(s, "rename");
        g_object_unref(info);
    }
    return good;
}

static int take_away(struct session* s, const char* name) {
    GFileInfo* const info = find(s, name);
    int good = 0;
    if (info != NULL) {
        good = ZYROCloud_Cloud_Delete(s->server_id, s, id_of(info), &s->err) || failed(s, "delete");
        g_object_unref(info);
    }
    return good;
}

static int run(struct session* s, const char* credentials, const char* name) {
    char* const new_name = g_strconcat("renamed ", name, NULL);
    const int good = (s->service->check(s, credentials) || failed(s, "check the account")) &&
                     list(s) && read_to_end(s, name) && give_name(s, name, new_name) && list(s) &&
                     take_away(s, new_name) && list(s);
    g_free(new_name);
    return good;
}

static const struct service* find_service(const char* name) {
    for (size_t i = 0; i < sizeof services / sizeof services[0]; i++) {
        if (strcmp(services[i].name, name) == 0) {
            return &services[i];
        }
    }
    return NULL;
}

int main(int argc, char** argv) {
    static char credentials[MOST_CREDENTIALS];
    struct session s = {NULL, NULL, NULL, NULL, G_IO_ERROR_FAILED};
    int good = 0;
    s.service = argc == 4 ? find_service(argv[1]) : NULL;
    if (s.service == NULL) {
        fprintf(stderr, "usage: backend box|dropbox|google|onedrive SERVER_ID NAME\n");
        return 2;
    }
    s.server_id = argv[2];
    credentials[fread(credentials, 1, sizeof credentials - 1, stdin)] = '\0';

    ZYROCloud_Cloud_InitCurlGlobal();
    if (ZYROCloud_Cache_Init(&s.cache)) {
        good = run(&s, credentials, argv[3]);
        ZYROCloud_Cache_Destroy(&s.cache);
    }
    free(s.account_id);
    ZYROCloud_Cloud_CleanupCurlGlobal();
    return good ? 0 : 1;
}
