/** The machine's proxy settings and how it names itself. */
#ifndef ZOSPLATFORM_DEVICE_H
#define ZOSPLATFORM_DEVICE_H

#ifdef __cplusplus
extern "C" {
#endif

/** Proxy for a URL as "host:port", "" for a direct connection. 1 on success, else 0 or less. */
int ZYROProxyGetAddrByUrl(const char* url, char* address, int size);

/**
 * Credentials as "user:password", "" for none, of the proxy that the calling thread was told of
 * last; it need not have asked where the machine has only one. 1 on success.
 */
int ZYROProxyGetAuth(char* auth, int size);

/** "PRODUCT/version (kernel)". 0 on success, -1 when the buffer is too small. */
int YLIBDsinfoUserAgentGet(const char* product, char* buffer, int size);

#ifdef __cplusplus
}
#endif

#endif
