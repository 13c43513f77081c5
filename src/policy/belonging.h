/** Owners of what the platform says about a user. */
#ifndef ZYROVFS_POLICY_BELONGING_H
#define ZYROVFS_POLICY_BELONGING_H

#include <zosplatform/text.h>
#include <zosplatform/user.h>

#include <memory>

#include "core/handle.h"

namespace ZYROVFS::Cfg {

using UniqueUser = std::unique_ptr<ZYROUSER, FreeWith<ZYROUserFree>>;
using UniqueList = std::unique_ptr<_tag_YLIBCSZLIST_, FreeWith<YLIBCSzListFree>>;

}  // namespace ZYROVFS::Cfg

#endif
