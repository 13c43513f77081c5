/** One file of the catalogue, and the record that the catalogue makes of it. */
#ifndef ZYROVFS_SERVER_MOUNT_FILE_H
#define ZYROVFS_SERVER_MOUNT_FILE_H

#include <json/value.h>
#include <zosplatform/text.h>

#include <memory>
#include <string>

#include "core/handle.h"
#include "core/source_line.h"

namespace ZYROVFS::Protocol {

struct _tag_VFS_PROTOCOL_INFO_ {
    std::string protocol;
    std::string name;
    std::string api;          ///< items separated by commas
    std::string enable_curl;  ///< text, as the file has it
    unsigned int default_port = 0;
};

/** The keys of one .mount file. Every failure is logged and named in the cell for `at`. */
class MountFile {
  public:
    /** VFS_ERR_OUT_OF_MEMORY. */
    bool Init(SourceLine at = SourceLine::Here());
    /** Takes in the file at `path`, forgetting the one before: VFS_ERR_FAILED. */
    bool Read(const std::string& path, SourceLine at = SourceLine::Here());
    /** The same for the file of a protocol in the catalogue. */
    bool ReadProtocol(const char* protocol, SourceLine at = SourceLine::Here());

    /** `absent` for a key that the file lacks. */
    const char* Get(const char* key, const char* absent) const;
    _tag_VFS_PROTOCOL_INFO_ Record() const;

  private:
    std::unique_ptr<_tag_YLIBCSZHASH_, FreeWith<YLIBCSzHashFree>> hash_;
};

/** What every answer of the catalogue tells of a protocol. */
Json::Value ToJson(const _tag_VFS_PROTOCOL_INFO_& info);

}  // namespace ZYROVFS::Protocol

#endif
