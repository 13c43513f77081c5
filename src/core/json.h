/** Whole JSON documents on disk and in memory. Nothing here throws. */
#ifndef ZYROVFS_CORE_JSON_H
#define ZYROVFS_CORE_JSON_H

#include <json/value.h>
#include <sys/types.h>

#include <cstdint>
#include <string>

#include "core/replace_file.h"

namespace ZYROVFS::json {

/**
 * Reads a whole document. Only a regular file is read: users may write to the directories that
 * hold profiles, so a symbolic link or a FIFO in a file's place is refused rather than followed or
 * waited for. False leaves `value` null and errno telling the cause (EINVAL for bad JSON).
 */
bool fromFile(Json::Value& value, const std::string& path);

/**
 * Replaces a whole document: new file beside the old one, written, flushed to disk, renamed over.
 * A crash, a kill or a full disk at any point leaves the old document. False keeps the old file
 * and leaves errno telling the cause; EINVAL and EFBIG are for a value that fromFile would refuse.
 * With an owner the new file is given to it before it takes its place; a caller that may not give
 * files away keeps them.
 */
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
