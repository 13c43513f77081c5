/** What the service is told of an item that it makes or changes. */
#ifndef ZYROVFS_CLOUD_GDRIVE_BODY_H
#define ZYROVFS_CLOUD_GDRIVE_BODY_H

#include <json/value.h>

#include <cstdint>
#include <string>

#include "core/json.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud::gdrive {

/** An item that lies in one folder. */
inline Json::Value Parents(const std::string& id) {
    Json::Value parent;
    parent["id"] = id;
    Json::Value parents(Json::arrayValue);
    parents.append(parent);
    return parents;
}

/** The item that an upload makes, by the arguments of the upload. */
inline Json::Value Uploaded(const Json::Value& meta) {
    Json::Value body(Json::objectValue);
    if (meta.isMember("title")) {
        body["title"] = Utils::EscapeDoubleQuote(meta["title"].asString());
    }
    if (meta.isMember("mimeType")) {
        body["mimeType"] = meta["mimeType"].asString();
    }
    const std::string parent_id = meta.get("parent_id", "").asString();
    if (!parent_id.empty()) {
        body["parents"] = Parents(parent_id);
    }
    return body;
}

/** Size of the source, -1 when it is not known. */
inline int64_t SourceSize(const Json::Value& meta) {
    int64_t size = -1;
    ZYROVFS::json::toInt64(meta.get("filesize", -1), size);
    return size;
}

}  // namespace ZYROCloud::gdrive

#endif
