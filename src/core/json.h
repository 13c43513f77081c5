/** Whole JSON documents on disk and in memory. Nothing here throws. */
#ifndef ZYROVFS_CORE_JSON_H
#define ZYROVFS_CORE_JSON_H

#include <json/value.h>
#include <sys/types.h>

#include <cstdint>
#include <string>

#include "core/owned_folder.h"

namespace ZYROVFS::json {

/**
 * Reads a whole document. Only a regular file of root's or of the folder's user is read, up to 64
 * MiB. False leaves `value` null and errno telling the cause (EINVAL for bad JSON).
 */
bool fromFile(Json::Value& value, const OwnedFolder& folder, const std::string& name);
/** The same by path, for this process's effective user. */
bool fromFile(Json::Value& value, const std::string& path);

/**
 * Replaces a whole document, as OwnedFolder::Replace does. False keeps the old file and leaves
 * errno telling the cause; EINVAL and EFBIG are for a value that fromFile would refuse.
 */
bool toFile(const Json::Value& value, const OwnedFolder& folder, const std::string& name,
            mode_t mode = 0600, FileOwner owner = {});
bool toFile(const Json::Value& value, const std::string& path, mode_t mode = 0600,
            FileOwner owner = {});

/** Parses one document and nothing behind it. False leaves `value` null. */
bool fromString(Json::Value& value, const std::string& text);

/** One line of text without a newline, "null" for a null value. Bytes of strings stay as they are.
 */
std::string toString(const Json::Value& value);

/** The same in printable ASCII alone, as headers need it; what is no valid UTF-8 is replaced. */
std::string toAscii(const Json::Value& value);

/** A number, or decimal text of one (services give sizes and times in either form). */
bool toInt64(const Json::Value& value, int64_t& number);
bool toUInt64(const Json::Value& value, uint64_t& number);

}  // namespace ZYROVFS::json

#endif
