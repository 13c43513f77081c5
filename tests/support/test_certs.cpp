#include "support/test_certs.h"

#include <openssl/bio.h>
#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <openssl/x509v3.h>

#include <stdexcept>

namespace tls {
namespace {

using Bio = std::unique_ptr<BIO, decltype(&BIO_free_all)>;
using Key = std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)>;

void Check(bool ok, const char* step) {
    if (!ok) {
        throw std::runtime_error(std::string("test certificate: ") + step);
    }
}

Bio Memory() {
    return {BIO_new(BIO_s_mem()), BIO_free_all};
}

Bio Memory(const std::string& text) {
    return {BIO_new_mem_buf(text.data(), static_cast<int>(text.size())), BIO_free_all};
}

std::string Text(BIO* bio) {
    char* data = nullptr;
    const long length = BIO_get_mem_data(bio, &data);
    return {data, static_cast<size_t>(length)};
}

std::string ToPem(X509* certificate) {
    const Bio bio = Memory();
    Check(PEM_write_bio_X509(bio.get(), certificate) == 1, "certificate as text");
    return Text(bio.get());
}

std::string ToPem(EVP_PKEY* key) {
    const Bio bio = Memory();
    Check(PEM_write_bio_PrivateKey(bio.get(), key, nullptr, nullptr, 0, nullptr, nullptr) == 1,
          "key as text");
    return Text(bio.get());
}

Key ParseKey(const std::string& pem) {
    const Bio bio = Memory(pem);
    return {PEM_read_bio_PrivateKey(bio.get(), nullptr, nullptr, nullptr), EVP_PKEY_free};
}

void SetSerial(X509* certificate) {
    unsigned char bytes[8];
    Check(RAND_bytes(bytes, sizeof bytes) == 1, "serial number");
    bytes[0] &= 0x7f;
    BIGNUM* number = BN_bin2bn(bytes, sizeof bytes, nullptr);
    BN_to_ASN1_INTEGER(number, X509_get_serialNumber(certificate));
    BN_free(number);
}

/** With the type given outright, OpenSSL asks neither for the length nor for the characters. */
void SetNames(X509_NAME* name, const CertSpec& spec) {
    for (const std::string& text : spec.common_names) {
        Check(X509_NAME_add_entry_by_NID(name, NID_commonName, spec.name_type,
                                         reinterpret_cast<const unsigned char*>(text.data()),
                                         static_cast<int>(text.size()), -1, 0) == 1,
              "common name");
    }
}

void AddExtension(X509* certificate, int nid, const std::string& value) {
    X509_EXTENSION* extension = X509V3_EXT_conf_nid(nullptr, nullptr, nid, value.c_str());
    Check(extension != nullptr, value.c_str());
    X509_add_ext(certificate, extension, -1);
    X509_EXTENSION_free(extension);
}

void AddExtensions(X509* certificate, const CertSpec& spec) {
    AddExtension(certificate, NID_basic_constraints,
                 spec.authority ? "critical,CA:TRUE" : "critical,CA:FALSE");
    if (spec.authority) {
        AddExtension(certificate, NID_key_usage, "critical,keyCertSign,cRLSign");
        return;
    }
    std::string names;
    for (const std::string& name : spec.dns_names) {
        names += (names.empty() ? "DNS:" : ",DNS:") + name;
    }
    if (!names.empty()) {
        AddExtension(certificate, NID_subject_alt_name, names);
    }
}

}  // namespace

std::shared_ptr<X509> Parse(const std::string& pem) {
    const Bio bio = Memory(pem);
    return {PEM_read_bio_X509(bio.get(), nullptr, nullptr, nullptr), X509_free};
}

Identity Make(const CertSpec& spec, const Identity* issuer) {
    const Key key(EVP_EC_gen("P-256"), EVP_PKEY_free);
    Check(key != nullptr, "key");
    const std::shared_ptr<X509> made(X509_new(), X509_free);
    X509_set_version(made.get(), X509_VERSION_3);
    SetSerial(made.get());
    X509_gmtime_adj(X509_getm_notBefore(made.get()), spec.starts);
    X509_gmtime_adj(X509_getm_notAfter(made.get()), spec.ends);
    X509_set_pubkey(made.get(), key.get());
    SetNames(X509_get_subject_name(made.get()), spec);
    AddExtensions(made.get(), spec);

    const std::shared_ptr<X509> signer = issuer == nullptr ? made : Parse(issuer->certificate);
    const Key signing = ParseKey(issuer == nullptr ? ToPem(key.get()) : issuer->key);
    X509_set_issuer_name(made.get(), X509_get_subject_name(signer.get()));
    Check(X509_sign(made.get(), signing.get(), EVP_sha256()) != 0, "signature");

    // A server sends what stands between it and the root; roots are known on the other side.
    const bool between =
        issuer != nullptr &&
        X509_NAME_cmp(X509_get_subject_name(signer.get()), X509_get_issuer_name(signer.get())) != 0;
    return {ToPem(made.get()) + (between ? issuer->certificate : ""), ToPem(key.get())};
}

Identity MakeAuthority(const std::string& name, const Identity* issuer) {
    CertSpec spec;
    spec.common_names = {name};
    spec.authority = true;
    return Make(spec, issuer);
}

}  // namespace tls
