#include <glib.h>

#include "containers.h"
#include "support.h"

PYLIBCSZLIST YLIBCSzListAlloc(int) {
    auto* list = new (std::nothrow) _tag_YLIBCSZLIST_;
    if (list == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_OUT_OF_MEMORY);
    }
    return list;
}

void YLIBCSzListFree(PYLIBCSZLIST list) {
    delete list;
}

int YLIBCSzListCount(const PYLIBCSZLIST list) {
    return list == nullptr ? 0 : static_cast<int>(list->items.size());
}

int YLIBCSzListPush(PYLIBCSZLIST* list, const char* text) {
    if (list == nullptr || *list == nullptr || text == nullptr) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return -1;
    }
    return zos::OrOutOfMemory(-1, [&] {
        (*list)->items.emplace_back(text);
        return 0;
    });
}

const char* YLIBCSzListGet(const PYLIBCSZLIST list, int index) {
    if (index < 0 || index >= YLIBCSzListCount(list)) {
        return nullptr;
    }
    return list->items[static_cast<size_t>(index)].c_str();
}

void YLIBCSzListRemoveAll(PYLIBCSZLIST list) {
    if (list != nullptr) {
        list->items.clear();
    }
}

int YLIBCSzListCaseFind(const PYLIBCSZLIST list, const char* text) {
    const int count = text == nullptr ? 0 : YLIBCSzListCount(list);
    for (int i = 0; i < count; ++i) {
        if (g_ascii_strcasecmp(YLIBCSzListGet(list, i), text) == 0) {
            return i;
        }
    }
    return -1;
}
