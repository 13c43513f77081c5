/**
 * Credentials at rest. Texts are enciphered with a key of this machine
 * (/usr/zyro/etc/private/zyrovfs.key, made at the first use by root), are printable, and are
 * refused when changed or brought from another machine.
 */
#ifndef ZOSPLATFORM_CREDENTIAL_H
#define ZOSPLATFORM_CREDENTIAL_H

#ifdef __cplusplus
extern "C" {
#endif

/**
 * Non-zero on success. On failure the buffer is cleared and the platform error tells why:
 * 0x2a00 a buffer that is too small, 0x3e00 a text that was not enciphered here, 0x900 no key,
 * 0xd00 a null argument or a text beyond half a gigabyte. `size` counts the final NUL.
 */
int YLIBCCryptSzEncrypt(const char* plain, char* out, unsigned int size);
int YLIBCCryptSzDecrypt(const char* cipher, char* out, unsigned int size);

#ifdef __cplusplus
}
#endif

#endif
