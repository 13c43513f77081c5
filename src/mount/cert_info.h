/**
 * The certificate that a server showed last, as it is told to the user who has to decide about it.
 * One per process: a handshake leaves it here, and a refused one hands it on as error detail.
 */
#ifndef ZYROVFS_MOUNT_CERT_INFO_H
#define ZYROVFS_MOUNT_CERT_INFO_H

#include <json/value.h>
#include <openssl/x509.h>

#include <ctime>
#include <string>

namespace ZYROVFS {

/**
 * Remembers a certificate: "subject" and "issuer" (last common name of each, "" for none),
 * "availDate" and "expDate" (epoch seconds). Null forgets the one before. Transfer threads shake
 * hands at the same time, so this is guarded.
 */
void KeepCertificate(X509* certificate);

/** The remembered one; null before the first handshake. */
Json::Value KeptCertificate();

/** Last CN entry as UTF-8, at most 1024 bytes, cut between characters. "" when there is none. */
std::string LastCommonName(const X509_NAME* name);

/** A certificate's date; its digits are taken as local time. */
time_t CertificateTime(const ASN1_TIME* time);

}  // namespace ZYROVFS

#endif
