/** The one place where names and paths of a request are checked. */
#ifndef ZYROVFS_WEB_NAME_H
#define ZYROVFS_WEB_NAME_H

#include <string>

namespace web {

/**
 * One name of an item: 1 to 255 bytes of valid UTF-8 without a slash or a NUL byte, and not "." or
 * "..". Failure with status 422.
 */
const std::string& CheckName(const std::string& name);

/** A path inside a connection: a slash and names between slashes, at most 4096 bytes. "/" is the
 * connection itself. Failure with status 422. */
const std::string& CheckPath(const std::string& path);

/** Folder and name of a path that has a name; Failure with status 422 for "/". */
struct Split {
    std::string folder;  ///< "/" or "/a/b"
    std::string name;
};
Split SplitPath(const std::string& path);

/** A path with one more name. */
std::string Join(const std::string& folder, const std::string& name);

/** Whether `path` is `folder` or below it. */
bool IsWithin(const std::string& path, const std::string& folder);

/** Whether CheckName would take it. */
bool IsName(const std::string& name);

bool IsUtf8(const std::string& text);

/** For `Content-Disposition`: a name that any browser keeps as it is. */
std::string Attachment(const std::string& name);
/** The same for what a browser may show in its place. */
std::string Inline(const std::string& name);

}  // namespace web

#endif
