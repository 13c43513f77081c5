/** One idea of "without regard to case" for comparing, searching and sorting. */
#ifndef ZOSPLATFORM_SRC_FOLD_H
#define ZOSPLATFORM_SRC_FOLD_H

#include <string>

namespace zos {

/**
 * A text by whose bytes it sorts and is searched: its UTF-8 stretches folded, other bytes as they
 * are. Comparing such keys is an order also of texts of which some are no UTF-8; deciding by pairs
 * whether to fold would not be.
 */
std::string FoldCase(const char* text);

}  // namespace zos

#endif
