#include "zosplatform/error.h"

namespace {

struct {
    unsigned int code = 0;
    const char* file = "";
    int line = 0;
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
