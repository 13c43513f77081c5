/** Google Drive: the kinds of its own documents, and what an upload says about Office files. */
#ifndef ZYROVFS_CLOUD_GDRIVE_TYPES_H
#define ZYROVFS_CLOUD_GDRIVE_TYPES_H

#include <string>

namespace ZYROCloud::gdrive {

/** A kind of document that is made in the service's editors and has no bytes of its own. */
struct DocumentType {
    const char* extension;  ///< with its dot; what the file tree shows behind the title
    const char* mime_type;
};

/** Null when no kind has it. Both compare with case. */
const DocumentType* FindDocumentByExtension(const std::string& extension);
const DocumentType* FindDocumentByType(const std::string& mime_type);

/** MIME type of an Office or OpenDocument file by the ending of its title, without case; null for
 * others, about which the service is told nothing. */
const char* FindUploadType(const std::string& title);

/** ".txt" of "a.txt", "." of "a."; "" without a dot. */
std::string ExtensionOf(const std::string& name);

}  // namespace ZYROCloud::gdrive

#endif
