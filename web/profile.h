/** New connections as a person describes them in a form. */
#ifndef ZYROVFS_WEB_PROFILE_H
#define ZYROVFS_WEB_PROFILE_H

#include <json/value.h>

#include <string>

#include "body.h"

namespace web {

/** The form of a protocol of the catalogue: "name", "label", "type", "required" and "value" of each
 * field. None for a cloud, whose accounts are signed in to elsewhere. */
Json::Value FieldsOf(const Json::Value& protocol);

/** The library's profile for a form that was filled in. Failure with status 400 or 422. */
Json::Value ReadProfile(const Body& body);

}  // namespace web

#endif
