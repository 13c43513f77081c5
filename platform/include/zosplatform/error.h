/** The platform's error cell: process-wide, written by platform calls and by their callers. */
#ifndef ZOSPLATFORM_ERROR_H
#define ZOSPLATFORM_ERROR_H

#ifdef __cplusplus
extern "C" {
#endif

/** Codes that plain Linux gives rise to; callers may set others. */
enum {
    ZOS_ERR_NONE = 0,
    ZOS_ERR_OUT_OF_MEMORY = 0x200,
    ZOS_ERR_NO_PERMISSION = 0x300,
    ZOS_ERR_TRY_AGAIN = 0x400,
    ZOS_ERR_UNLOCK_FAILED = 0x500,
    ZOS_ERR_NOT_FOUND = 0x600,
    ZOS_ERR_EXISTS = 0x800,
    ZOS_ERR_OPEN_FAILED = 0x900,
    ZOS_ERR_BAD_PARAMETER = 0xd00,
    ZOS_ERR_NO_SUCH_USER = 0x1d00,
    ZOS_ERR_NO_SUCH_GROUP = 0x1e00,
    ZOS_ERR_WRITE_FAILED = 0x2900,
    ZOS_ERR_BUFFER_TOO_SMALL = 0x2a00,
    ZOS_ERR_SYSTEM = 0x3c00,
    ZOS_ERR_BAD_CIPHER_TEXT = 0x3e00,
    ZOS_ERR_BAD_FORMAT = 0x8200,
    ZOS_ERR_NOT_A_FOLDER = 0xa100,
};

/** `file` must be a literal: the pointer is kept. */
void YLIBCErrSetEx(unsigned int code, const char* file, int line);
unsigned int YLIBCErrGet(void);
/** Never null: "" before anything was set. */
const char* YLIBCErrorGetFile(void);
int YLIBCErrorGetLine(void);

#ifdef __cplusplus
}
#endif

#endif
