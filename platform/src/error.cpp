#include "zosplatform/error.h"

#include <atomic>

namespace {

/** Process-wide, as callers expect it; the two threads of a copy write it, too. */
struct {
    std::atomic<unsigned int> code = 0;
    std::atomic<const char*> file = "";
    std::atomic<int> line = 0;
} cell;

}  // namespace

void YLIBCErrSetEx(unsigned int code, const char* file, int line) {
    cell.code = code;
    cell.file = file == nullptr ? "" : file;
    cell.line = line;
}

unsigned int YLIBCErrGet() {
    return cell.code;
}

const char* YLIBCErrorGetFile() {
    return cell.file;
}

int YLIBCErrorGetLine() {
    return cell.line;
}
