/**
 * Bad input reaches the code as exceptions of jsoncpp: text of an object, a member of an array.
 * An exported operation turns them into its failure here; nothing leaves the library by exception.
 */
#ifndef ZYROVFS_CORE_NO_THROW_H
#define ZYROVFS_CORE_NO_THROW_H

#include <json/value.h>

#include <new>

#include "core/error_cell.h"
#include "core/log.h"

namespace ZYROVFS {

/**
 * Runs `body`, which answers bool. A value of the wrong type is logged and gives `code` and false;
 * memory that ran out gives VFS_ERR_OUT_OF_MEMORY, anything else VFS_ERR_FAILED.
 */
template <typename Body>
bool NoThrow(__tag_vfs_err_ code, Body body, SourceLine at = SourceLine::Here()) noexcept {
    try {
        return body();
    } catch (const Json::Exception& e) {
        LOG_ERROR_AT(at, "Wrong JSON value, %s", e.what());
        return Fail(code, at);
    } catch (const std::bad_alloc&) {
        LOG_ERROR_AT(at, "Out of memory");
        return Fail(VFS_ERR_OUT_OF_MEMORY, at);
    } catch (const std::exception& e) {
        LOG_ERROR_AT(at, "Unexpected failure, %s", e.what());
        return Fail(VFS_ERR_FAILED, at);
    }
}

}  // namespace ZYROVFS

#endif
