/** What stands behind the handles of zosplatform/text.h. */
#ifndef ZOSPLATFORM_SRC_CONTAINERS_H
#define ZOSPLATFORM_SRC_CONTAINERS_H

#include <map>
#include <string>
#include <vector>

#include "zosplatform/text.h"

namespace zos {

using TextMap = std::map<std::string, std::string, std::less<>>;

}  // namespace zos

struct _tag_YLIBCSZLIST_ {
    std::vector<std::string> items;
};

struct _tag_YLIBCSZHASH_ {
    zos::TextMap values;
};

#endif
