/* The flat face, as a backend written in C uses it: compiled as C11 and linked with the shipped
 * library by flat_c_test.sh. Says what is wrong and ends with 1, or says "ok". */
#include <string.h>
#include <zyrovfs/zyrocloud.h>

#include <stdio.h>

static int failures = 0;

#define EXPECT(condition)                                                         \
    do {                                                                          \
        if (!(condition)) {                                                       \
            fprintf(stderr, "flat_c.c:%d: %s is not so\n", __LINE__, #condition); \
            ++failures;                                                           \
        }                                                                         \
    } while (0)

static GFileInfo* NewInfo(const char* name) {
    GFileInfo* info = g_file_info_new();
    g_file_info_set_name(info, name);
    g_file_info_set_display_name(info, name);
    return info;
}

static void Cache(void) {
    ZYROCloud_Cache* cache = NULL;
    GFileInfo* info = NewInfo("a.txt");
    GFileInfo* found = NULL;
    EXPECT(ZYROCloud_Cache_Init(&cache) == 1 && cache != NULL);
    EXPECT(ZYROCloud_Cache_Lock(&cache) == 1);
    EXPECT(ZYROCloud_Cache_List_Remove(cache, "/docs") == 1);
    EXPECT(ZYROCloud_Cache_Entry_Add(cache, "/docs", info) == 1);
    EXPECT(ZYROCloud_Cache_List_Add(cache, "/docs", true, info) == 1);
    EXPECT(ZYROCloud_Cache_Unlock(&cache) == 1);
    EXPECT(ZYROCloud_Cache_List_Ori_Get(cache, "/docs", "a.txt") == 1);
    EXPECT(ZYROCloud_Cache_Entry_SetMTime(cache, "/docs/a.txt", 1700000000) == 1);
    EXPECT(ZYROCloud_Cache_Entry_Get(cache, "/docs/a.txt", &found) == 1);
    EXPECT(found != NULL && strcmp(g_file_info_get_name(found), "a.txt") == 0);
    EXPECT(ZYROCloud_Cache_Entry_Remove(cache, "/docs/a.txt", true) == 1);
    EXPECT(ZYROCloud_Cache_Entry_Get(cache, "/docs/a.txt", &found) == 0);
    EXPECT(ZYROCloud_Cache_Entry_None_Get(cache, "/docs/a.txt") == 1);
    EXPECT(ZYROCloud_Cache_Entry_Clean(cache) == 1);
    EXPECT(ZYROCloud_Cache_Destroy(&cache) == 1);
    EXPECT(ZYROCloud_Cache_CassLess_Init(&cache) == 1);
    EXPECT(ZYROCloud_Cache_Entry_Add(cache, "/", info) == 1);
    EXPECT(ZYROCloud_Cache_Entry_Get(cache, "/A.TXT", &found) == 1);
    EXPECT(ZYROCloud_Cache_Destroy(&cache) == 1);
    g_object_unref(info);
}

static void Handle(void) {
    char bytes[8] = "";
    char* dest = bytes;
    ZYROCloud_Handle* handle = ZYROCloud_Cloud_Handle_New("box://nobody@example.com", "/a", NULL);
    EXPECT(handle != NULL);
    EXPECT(ZYROCloud_FileHandle_Buf_Init(handle) == 1);
    EXPECT(ZYROCloud_FileHandle_Buf_GetBufSize(handle) == 0x1000000);
    memcpy(ZYROCloud_FileHandle_Buf_Get(handle), "hello", 5);
    ZYROCloud_FileHandle_Buf_Reset(handle, 5);
    EXPECT(ZYROCloud_FileHandle_Buf_Fill(handle, &dest, sizeof bytes) == 5);
    EXPECT(strcmp(bytes, "hello") == 0);
    EXPECT(ZYROCloud_FileHandle_Buf_Fill(handle, &dest, sizeof bytes) == 0);
    ZYROCloud_FileHandle_Buf_SetBufSize(handle, 4096);
    EXPECT(ZYROCloud_FileHandle_Buf_GetBufSize(handle) == 4096);
    ZYROCloud_FileHandle_Buf_Free(handle);
    EXPECT(ZYROCloud_FileHandle_Buf_Get(handle) == NULL);
    ZYROCloud_Cloud_Handle_Free(handle, NULL);
}

static void RootAtime(void) {
    ZYROCloud_RootAtime atime;
    InitRootAtime(&atime);
    UpdateRootAtime(&atime);
    EXPECT(GetRootAtime(&atime) > 0 && GetRootAtime(NULL) == 0);
    DestroyRootAtime(&atime);
}

/* No service is asked: there is no such connection, or an argument is missing. */
static void Operations(void) {
    const char* nobody = "box://nobody@example.com";
    int err = 4711;
    EXPECT(ZYROCloud_Cloud_Rename(nobody, &err, "files/1", "b", &err) == 0);
    EXPECT(ZYROCloud_Cloud_Move(nobody, &err, "files/1", "files/2", &err) == 0);
    EXPECT(ZYROCloud_Cloud_Delete(nobody, &err, "files/1", &err) == 0);
    EXPECT(ZYROCloud_Cloud_CreateFolder(nobody, &err, "folders/0", "b", &err) == 0);
    EXPECT(ZYROCloud_IsHiddenFolder("/", "'") == 1);
    EXPECT(err == 4711);
}

static void Count(GFileInfo* info, void* user_data) {
    *(int*)user_data += info != NULL;
}

static void Services(void) {
    const ZYROCloud_ListCallback count = Count;
    int items = 0;
    int err = 4711;
    EXPECT(ZYROCloud_Cloud_Google_Get_File_Type("/My Drive/a") == 4);
    EXPECT(ZYROCloud_Cloud_Google_Is_First_Folder("/Starred") == 1);
    EXPECT(ZYROCloud_Cloud_Google_List(NULL, NULL, NULL, NULL, count, &items, &err) == 0);
    EXPECT(ZYROCloud_Cloud_Google_CheckAccount(NULL, NULL, &err) == 0);
    EXPECT(ZYROCloud_Cloud_Google_Move(NULL, NULL, NULL, NULL, NULL, &err) == 0);
    EXPECT(ZYROCloud_Cloud_Google_DeleteStarred(NULL, NULL, NULL, &err) == 0);
    EXPECT(ZYROCloud_Cloud_Google_Chmod_MTime(NULL, NULL, NULL, 0, &err) == 0);
    EXPECT(ZYROCloud_Cloud_Google_Download(NULL, NULL, NULL, NULL, 1, &err) == -1);
    EXPECT(ZYROCloud_Cloud_Box_List(NULL, NULL, NULL, NULL, NULL, count, &items, &err) == 0);
    EXPECT(ZYROCloud_Cloud_Box_CheckAccount(NULL, NULL, NULL, &err) == 0);
    EXPECT(ZYROCloud_Cloud_Box_Move(NULL, NULL, NULL, NULL, NULL, &err) == 0);
    EXPECT(ZYROCloud_Cloud_Box_Download(NULL, NULL, NULL, NULL, 1, &err) == -1);
    EXPECT(ZYROCloud_Cloud_Dropbox_List(NULL, NULL, NULL, count, &items, &err) == 0);
    EXPECT(ZYROCloud_Cloud_Dropbox_Get(NULL, NULL, NULL, NULL, &err) == 0);
    EXPECT(ZYROCloud_Cloud_Dropbox_CheckAccount(NULL, NULL, &err) == 0);
    EXPECT(ZYROCloud_Cloud_Dropbox_Download(NULL, NULL, NULL, NULL, 1, &err) == -1);
    EXPECT(ZYROCloud_Cloud_OneDrive_GetRoot(NULL, NULL, count, &items, &err) == 0);
    EXPECT(ZYROCloud_Cloud_OneDrive_List(NULL, NULL, NULL, NULL, count, &items, &err) == 0);
    EXPECT(ZYROCloud_Cloud_OneDrive_CheckAccount(NULL, NULL, &err) == 0);
    EXPECT(ZYROCloud_Cloud_OneDrive_Move(NULL, NULL, NULL, NULL, NULL, &err) == 0);
    EXPECT(ZYROCloud_Cloud_OneDrive_Download(NULL, NULL, NULL, NULL, 1, &err) == -1);
    EXPECT(items == 0);
    EXPECT(err == 4711);
}

int main(void) {
    ZYROCloud_Cloud_InitCurlGlobal();
    Cache();
    Handle();
    RootAtime();
    Operations();
    Services();
    ZYROCloud_Cloud_CleanupCurlGlobal();
    if (failures == 0) {
        puts("ok");
    }
    return failures == 0 ? 0 : 1;
}
