/** The document of the service configuration, for the units that read and write it. */
#ifndef ZYROVFS_CLOUD_SERVICE_DOCUMENT_H
#define ZYROVFS_CLOUD_SERVICE_DOCUMENT_H

#include <json/value.h>

#include <string>

namespace ZYROCloud::service_document {

inline constexpr const char* kHosts = "hosts";
inline constexpr const char* kClients = "clients";
/** The passphrase of the client secrets, enciphered as credentials are. */
inline constexpr const char* kKey = "key";

enum class State {
    kRead,     ///< an object
    kMissing,  ///< no file; the document is an empty object
    kRefused,  ///< not to be trusted or not readable, which is logged; the same
};

State Read(Json::Value& document);

/** A member of an object; null for anything else. */
const Json::Value& Member(const Json::Value& object, const std::string& name);

/** The plain passphrase of a document. False when it has none, or none that this machine made. */
bool Passphrase(const Json::Value& document, std::string& passphrase);

/** A secret as the document holds it: what Utils::Decrypt reads, given a document with the same
 * passphrase. "" on failure. */
std::string Encipher(const std::string& passphrase, const std::string& secret);

/** Most bytes of an enciphered secret that its readers take. */
inline constexpr size_t kLongestSecret = 1023;

}  // namespace ZYROCloud::service_document

#endif
