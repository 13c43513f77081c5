/** Google's partial answers: which fields of a resource a request wants. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_GDRIVE_FIELDS_H
#define ZYROVFS_TESTS_CLOUDSIM_GDRIVE_FIELDS_H

#include <json/value.h>

#include <map>
#include <string>

namespace cloudsim::gdrive {

/** A mask without members stands for everything. */
struct Mask {
    std::map<std::string, Mask> members;

    bool Wants(const std::string& field) const;
    /** The mask of a member that is wanted. */
    const Mask& Of(const std::string& field) const;
    /** The document with nothing but what is wanted. */
    Json::Value Apply(const Json::Value& document) const;
};

/** What a resource may have, down to plain values, whose schema is empty. */
using Schema = Mask;

extern const Schema kFileSchema, kListSchema, kAboutSchema;

/**
 * "items(id,title,parents/id),nextPageToken". Throws a Failure (400) that names what is no field
 * of this resource. An empty text is the mask of everything.
 */
Mask ParseFields(const std::string& text, const Schema& schema);

}  // namespace cloudsim::gdrive

#endif
