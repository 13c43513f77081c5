/** Text containers and text helpers. */
#ifndef ZOSPLATFORM_TEXT_H
#define ZOSPLATFORM_TEXT_H

#ifdef __cplusplus
extern "C" {
#endif

/** A growing list of texts. Items stay valid until the list changes. */
typedef struct _tag_YLIBCSZLIST_* PYLIBCSZLIST;
/** Texts by key. Values stay valid until the hash changes. */
typedef struct _tag_YLIBCSZHASH_* PYLIBCSZHASH;

/** `size` is the expected size in bytes, a hint. Null when memory ran out. */
PYLIBCSZLIST YLIBCSzListAlloc(int size);
void YLIBCSzListFree(PYLIBCSZLIST list);
int YLIBCSzListCount(const PYLIBCSZLIST list);
/** 0, or -1 when memory ran out. */
int YLIBCSzListPush(PYLIBCSZLIST* list, const char* text);
/** Null for an index outside of the list. */
const char* YLIBCSzListGet(const PYLIBCSZLIST list, int index);
void YLIBCSzListRemoveAll(PYLIBCSZLIST list);
/** Index of `text` without regard to ASCII case, or -1. */
int YLIBCSzListCaseFind(const PYLIBCSZLIST list, const char* text);

PYLIBCSZHASH YLIBCSzHashAlloc(int size);
void YLIBCSzHashFree(PYLIBCSZHASH hash);
/** 0, or -1 when memory ran out. */
int YLIBCSzHashSetValue(PYLIBCSZHASH* hash, const char* key, const char* value);
/** Null when the key is absent. */
const char* YLIBCSzHashGetValue(const PYLIBCSZHASH hash, const char* key);

/** strtok with its state in `*rest`: the next piece of `text` (null to go on), or null. */
char* YLIBCStrTok(char* text, const char* delimiters, char** rest);

/** Order of two UTF-8 texts without regard to case: negative, 0 or positive. Bytes that are not
 * UTF-8 compare as bytes; null sorts first. */
int YLIBCUnicodeUTF8StrCaseCmp(const char* a, const char* b);

#ifdef __cplusplus
}
#endif

#endif
