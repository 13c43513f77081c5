/** The start of a form that carries one file: what stands in front of the file's first byte. */
#ifndef ZYROVFS_WEB_FORM_H
#define ZYROVFS_WEB_FORM_H

#include <string>

namespace web {

struct Form {
    std::string boundary;         ///< with its leading dashes, as it stands in the body
    unsigned long long read = 0;  ///< bytes of the body consumed
};

/**
 * Reads the form in standard input up to the content of its first part, and no byte further.
 * `content_type` is the request's. Failure with status 400 for a body that is no such form, 413 for
 * a part whose own headers are longer than 16 KiB.
 */
Form ReadForm(const std::string& content_type);

/** Value of "boundary" in a header "Content-Type"; Failure with status 400 without one. */
std::string BoundaryOf(const std::string& content_type);

}  // namespace web

#endif
