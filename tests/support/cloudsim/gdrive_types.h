/** MIME types of Google Drive's items, and the forms that its own documents are exported in. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_GDRIVE_TYPES_H
#define ZYROVFS_TESTS_CLOUDSIM_GDRIVE_TYPES_H

#include <map>
#include <string>

#include "support/cloudsim/tree.h"

namespace cloudsim::gdrive {

constexpr const char* kFolderType = "application/vnd.google-apps.folder";

std::string MimeType(const Node& node);
/** Documents of Google's own have no bytes, only forms to export them in. */
bool IsDocument(const Node& node);
/** By the ending of a title; application/octet-stream when it tells nothing. */
std::string MimeTypeOfTitle(const std::string& title);

/** What a document can be exported as: MIME type to the word in the link. */
const std::map<std::string, std::string>& ExportFormats(const std::string& document_type);
/** MIME type of the word in an export's link; empty for an unknown one. */
std::string ExportType(const std::string& format);

}  // namespace cloudsim::gdrive

#endif
