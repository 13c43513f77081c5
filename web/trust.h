/** Servers whose identity a person has to decide about. */
#ifndef ZYROVFS_WEB_TRUST_H
#define ZYROVFS_WEB_TRUST_H

#include <json/value.h>
#include <zyrovfs/error.h>

#include <functional>
#include <string>

namespace web {

/**
 * What the page shows of an unknown host key or an untrusted certificate: "kind", "host", what the
 * library knows of it, "changed", and a "token" that stands for exactly this. Null for a failure
 * that is no such question. `host` is the one that was meant to be reached.
 */
Json::Value DescribeTrust(ZYROVFS::__tag_vfs_err_ code, const std::string& host,
                          const Json::Value& detail);

/**
 * Runs an operation of the library that may ask such a question. It is run again with `force` only
 * when the server still shows what the person has accepted: the token of an earlier answer. Failure
 * of what `what` says, with status 409 and the question where there is one.
 */
void WithTrust(const std::string& what, const std::string& host, const std::string& accept,
               const std::function<bool(bool force)>& operation);

}  // namespace web

#endif
