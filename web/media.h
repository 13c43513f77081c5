/** Files that a browser only shows and never runs. */
#ifndef ZYROVFS_WEB_MEDIA_H
#define ZYROVFS_WEB_MEDIA_H

#include <string>

namespace web {

/** The type of a picture, a film or a sound by the ending of its name; "" for all else. */
std::string ViewableType(const std::string& name);

}  // namespace web

#endif
