/** One request, as the web server hands it over. Nothing in it is trusted. */
#ifndef ZYROVFS_WEB_REQUEST_H
#define ZYROVFS_WEB_REQUEST_H

#include <json/value.h>

#include <map>
#include <string>
#include <vector>

namespace web {

struct Request {
    std::string method;
    std::string path;
    std::string content_type;
    std::string range;  ///< header of this name
    std::multimap<std::string, std::string> query;
    long long length = -1;  ///< of the body; -1 when the request does not tell

    /** A parameter of the query; Failure with status 400 without it. */
    const std::string& Parameter(const std::string& name) const;
    std::string Parameter(const std::string& name, const std::string& otherwise) const;
    /** All of this name, in their order. */
    std::vector<std::string> Parameters(const std::string& name) const;
};

/** Failure with status 400 for what cannot be read. */
Request ReadRequest();

/**
 * Refuses what another site makes a browser send: a request that changes something needs a header
 * that only a script of this page can set, and an Origin that is this host. Failure, status 403.
 */
void CheckOrigin();

/** The body, an object of at most 64 KiB. Failure with status 400 or 413. */
Json::Value ReadJson(const Request& request);

/** Text as it stood before it was escaped for a URL. Failure with status 400 for NUL bytes and
 * broken escapes. */
std::string Unescape(const std::string& text);

}  // namespace web

#endif
