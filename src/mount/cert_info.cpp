#include "mount/cert_info.h"

#include <openssl/asn1.h>
#include <openssl/crypto.h>

#include <mutex>

namespace ZYROVFS {
namespace {

constexpr size_t kNameLimit = 1024;

std::mutex kept_mutex;

Json::Value& Kept() {
    static Json::Value certificate;
    return certificate;
}

/** Shortens UTF-8 text without leaving half a character. */
void Cut(std::string& text, size_t limit) {
    if (text.size() <= limit) {
        return;
    }
    while (limit > 0 && (static_cast<unsigned char>(text[limit]) & 0xC0) == 0x80) {
        --limit;
    }
    text.resize(limit);
}

/** `count` decimal digits from `at`. What is missing or no digit counts as 0: the text comes from
 * the other side and may hold anything. */
int Digits(const ASN1_TIME* time, int at, int count) {
    const unsigned char* text = ASN1_STRING_get0_data(time);
    int number = 0;
    for (int i = at; i < at + count; ++i) {
        const bool digit = i < ASN1_STRING_length(time) && text[i] >= '0' && text[i] <= '9';
        number = number * 10 + (digit ? text[i] - '0' : 0);
    }
    return number;
}

tm UtcTime(const ASN1_TIME* time) {
    const int year = Digits(time, 0, 2);
    tm parts{};
    parts.tm_year = year < 70 ? year + 100 : year;
    parts.tm_mon = Digits(time, 2, 2) - 1;
    parts.tm_mday = Digits(time, 4, 2);
    parts.tm_hour = Digits(time, 6, 2);
    parts.tm_min = Digits(time, 8, 2);
    parts.tm_sec = Digits(time, 10, 2);
    return parts;
}

tm GeneralizedTime(const ASN1_TIME* time) {
    tm parts{};
    parts.tm_year = Digits(time, 0, 4) - 1900;
    parts.tm_mon = Digits(time, 4, 2) - 1;
    parts.tm_mday = Digits(time, 6, 2);
    parts.tm_hour = Digits(time, 8, 2);
    parts.tm_min = Digits(time, 10, 2);
    // The seconds begin on the last digit of the minutes. The web pages have shown and kept dates
    // read so since the first release; read otherwise, the same certificate would look renewed.
    parts.tm_sec = Digits(time, 11, 2);
    return parts;
}

}  // namespace

time_t CertificateTime(const ASN1_TIME* time) {
    tm parts{};
    const int type = time == nullptr ? V_ASN1_UNDEF : ASN1_STRING_type(time);
    if (type == V_ASN1_UTCTIME) {
        parts = UtcTime(time);
    } else if (type == V_ASN1_GENERALIZEDTIME) {
        parts = GeneralizedTime(time);
    }
    return mktime(&parts);
}

std::string LastCommonName(const X509_NAME* name) {
    int last = -1;
    for (int i = -1; (i = X509_NAME_get_index_by_NID(name, NID_commonName, i)) >= 0;) {
        last = i;
    }
    if (last < 0) {
        return "";
    }
    unsigned char* utf8 = nullptr;
    const int length =
        ASN1_STRING_to_UTF8(&utf8, X509_NAME_ENTRY_get_data(X509_NAME_get_entry(name, last)));
    if (length < 0) {
        return "";
    }
    // By its length: a name with a NUL in it would otherwise pose as the name before the NUL.
    std::string text(reinterpret_cast<char*>(utf8), static_cast<size_t>(length));
    OPENSSL_free(utf8);
    Cut(text, kNameLimit);
    return text;
}

void KeepCertificate(X509* certificate) {
    Json::Value kept;
    if (certificate != nullptr) {
        kept["subject"] = LastCommonName(X509_get_subject_name(certificate));
        kept["issuer"] = LastCommonName(X509_get_issuer_name(certificate));
        kept["availDate"] =
            static_cast<Json::Int64>(CertificateTime(X509_get0_notBefore(certificate)));
        kept["expDate"] =
            static_cast<Json::Int64>(CertificateTime(X509_get0_notAfter(certificate)));
    }
    const std::lock_guard<std::mutex> lock(kept_mutex);
    Kept().swap(kept);
}

Json::Value KeptCertificate() {
    const std::lock_guard<std::mutex> lock(kept_mutex);
    return Kept();
}

}  // namespace ZYROVFS
