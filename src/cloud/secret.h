/** OAuth clients: from a client's id to its secret, and the request for a new token. */
#ifndef ZYROVFS_CLOUD_SECRET_H
#define ZYROVFS_CLOUD_SECRET_H

#include <string>

#include "core/source_line.h"
#include "http/api_handler.h"

namespace ZYROCloud {

/** The plain secret of a service's client, as the service configuration has it. False logs why. */
bool FindSecret(const std::string& service, const std::string& client_id, std::string& secret,
                ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/** The four fields of a form that asks for a new token. False when there is no secret. */
bool AddRefreshGrant(APIHandler& api, const std::string& service, const std::string& client_id,
                     const std::string& refresh_token,
                     ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

}  // namespace ZYROCloud

#endif
