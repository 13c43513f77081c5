/** Texts of a profile as they come in: from the web, or from a file that its user may edit. */
#ifndef ZYROVFS_SERVER_PROFILE_TEXT_H
#define ZYROVFS_SERVER_PROFILE_TEXT_H

#include <json/value.h>

#include <cstddef>
#include <limits>

#include "core/source_line.h"

namespace ZYROVFS::Server {

/** What a text member must be, beside being a text without NUL (C interfaces would cut it). */
struct TextRule {
    bool utf8;       ///< the session bus carries no other text; remote names may be any bytes
    size_t longest;  ///< bytes
};

/** Far beyond any name, path or password of a server; a longer text is no profile of anybody. */
inline constexpr size_t kLongestText = 65536;

inline constexpr TextRule kNameRule{true, kLongestText};
inline constexpr TextRule kRemoteNameRule{false, kLongestText};
inline constexpr TextRule kAnyLengthRule{true, std::numeric_limits<size_t>::max()};

/** True when the value is a text that keeps the rule. A refusal is logged in the name of `at`. */
bool IsProfileText(const char* key, const Json::Value& value, const TextRule& rule,
                   SourceLine at = SourceLine::Here());

/** The same for a member that may be missing; null counts as missing. */
bool IsOptionalText(const char* key, const Json::Value& value, const TextRule& rule,
                    SourceLine at = SourceLine::Here());

/** Logs and answers false unless the value is a number from 0 to 4294967295. */
bool IsProfileNumber(const char* key, const Json::Value& value, SourceLine at = SourceLine::Here());

/** The same for a member that may be missing. */
bool IsOptionalNumber(const char* key, const Json::Value& value,
                      SourceLine at = SourceLine::Here());

}  // namespace ZYROVFS::Server

#endif
