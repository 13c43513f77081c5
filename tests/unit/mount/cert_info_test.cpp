#include "mount/cert_info.h"

#include <gtest/gtest.h>
#include <openssl/asn1.h>

#include <cstdlib>
#include <memory>
#include <thread>
#include <vector>

#include "core/json.h"
#include "support/test_certs.h"

namespace ZYROVFS {
namespace {

class CertTime : public testing::Test {
  protected:
    void SetUp() override { Zone("UTC0"); }
    void TearDown() override { Zone("UTC0"); }

    static void Zone(const char* name) {
        setenv("TZ", name, 1);
        tzset();
    }
    static time_t Read(int type, const std::string& digits) {
        const std::unique_ptr<ASN1_STRING, decltype(&ASN1_STRING_free)> time(
            ASN1_STRING_type_new(type), ASN1_STRING_free);
        ASN1_STRING_set(time.get(), digits.data(), static_cast<int>(digits.size()));
        return CertificateTime(time.get());
    }
    static time_t Utc(const std::string& digits) { return Read(V_ASN1_UTCTIME, digits); }
    static time_t General(const std::string& d) { return Read(V_ASN1_GENERALIZEDTIME, d); }

    /** `date -u +%s` of the clock time. */
    static time_t At(int year, int month, int day, int hour, int minute, int second) {
        tm parts{};
        parts.tm_year = year - 1900;
        parts.tm_mon = month - 1;
        parts.tm_mday = day;
        parts.tm_hour = hour;
        parts.tm_min = minute;
        parts.tm_sec = second;
        return timegm(&parts);
    }
};

TEST_F(CertTime, TwoDigitYearsBelow70BelongToThisCentury) {
    EXPECT_EQ(Utc("690102030405Z"), At(2069, 1, 2, 3, 4, 5));
    EXPECT_EQ(Utc("000229235959Z"), At(2000, 2, 29, 23, 59, 59));
}

TEST_F(CertTime, TwoDigitYearsFrom70BelongToTheLastCentury) {
    EXPECT_EQ(Utc("700101000000Z"), 0);
    EXPECT_EQ(Utc("991231235959Z"), At(1999, 12, 31, 23, 59, 59));
}

TEST_F(CertTime, SecondsOfFourDigitYearsBeginOnTheLastDigitOfTheMinutes) {
    // 56 minutes 34 seconds: digits 10 to 13 are 5634, so the seconds read 63.
    EXPECT_EQ(General("20501231125634Z"), At(2050, 12, 31, 12, 56, 63));
    EXPECT_EQ(General("20501231120000Z"), At(2050, 12, 31, 12, 0, 0));
    EXPECT_EQ(General("20501231120900Z"), At(2050, 12, 31, 12, 9, 90));
}

TEST_F(CertTime, DigitsAreLocalTime) {
    Zone("EST5");
    EXPECT_EQ(Utc("700101000000Z"), 5 * 3600);
    EXPECT_EQ(General("19700101000000Z"), 5 * 3600);
}

TEST_F(CertTime, AnyOtherTypeIsAZeroedDate) {
    const time_t zeroed = At(1899, 12, 31, 0, 0, 0);
    EXPECT_EQ(Read(V_ASN1_OCTET_STRING, "700101000000Z"), zeroed);
    EXPECT_EQ(CertificateTime(nullptr), zeroed);
}

TEST_F(CertTime, TornAndGarbledDatesAreReadAsFarAsTheyGo) {
    EXPECT_EQ(Utc("7001010102"), At(1970, 1, 1, 1, 2, 0));
    EXPECT_EQ(Utc("70010101xx59Z"), At(1970, 1, 1, 1, 0, 59));
    EXPECT_EQ(Utc(""), At(1999, 11, 30, 0, 0, 0));
    EXPECT_EQ(General("1970"), At(1969, 11, 30, 0, 0, 0));
}

using UniqueName = std::unique_ptr<X509_NAME, decltype(&X509_NAME_free)>;

/** The common name that comes back of a name with these CN entries. */
std::string CommonName(const std::vector<std::string>& entries, int type = V_ASN1_UTF8STRING) {
    const UniqueName name(X509_NAME_new(), X509_NAME_free);
    X509_NAME_add_entry_by_txt(name.get(), "O", MBSTRING_ASC,
                               reinterpret_cast<const unsigned char*>("Org"), -1, -1, 0);
    for (const std::string& text : entries) {
        X509_NAME_add_entry_by_NID(name.get(), NID_commonName, type,
                                   reinterpret_cast<const unsigned char*>(text.data()),
                                   static_cast<int>(text.size()), -1, 0);
    }
    X509_NAME_add_entry_by_txt(name.get(), "OU", MBSTRING_ASC,
                               reinterpret_cast<const unsigned char*>("Unit"), -1, -1, 0);
    return LastCommonName(name.get());
}

TEST(CertName, IsTheLastCommonName) {
    EXPECT_EQ(CommonName({"first", "second", "last"}), "last");
}

TEST(CertName, IsEmptyWithoutACommonName) {
    EXPECT_EQ(CommonName({}), "");
}

TEST(CertName, Of1100BytesIsCutAt1024) {
    EXPECT_EQ(CommonName({std::string(1100, 'n')}), std::string(1024, 'n'));
    EXPECT_EQ(CommonName({std::string(1024, 'n')}), std::string(1024, 'n'));
}

TEST(CertName, IsNotCutInTheMiddleOfACharacter) {
    const std::string text = std::string(1022, 'n') + "\xE2\x82\xAC" + "tail";
    EXPECT_EQ(CommonName({text}), std::string(1022, 'n'));
    const std::string fits = std::string(1021, 'n') + "\xE2\x82\xAC" + "tail";
    EXPECT_EQ(CommonName({fits}), std::string(1021, 'n') + "\xE2\x82\xAC");
}

TEST(CertName, WithANulInItKeepsWhatFollows) {
    const std::string text("bank.example\0.evil.example", 26);
    EXPECT_EQ(CommonName({text}), text);
}

TEST(CertName, InOtherAlphabetsComesAsUtf8) {
    EXPECT_EQ(CommonName({"caf\xE9"}, V_ASN1_T61STRING), "caf\xC3\xA9");
    EXPECT_EQ(CommonName({std::string("\0N\0A\x20\xAC", 6)}, V_ASN1_BMPSTRING), "NA\xE2\x82\xAC");
}

TEST(CertName, ThatIsNoTextIsEmpty) {
    EXPECT_EQ(CommonName({"\xC3\x28"}), "");
    EXPECT_EQ(CommonName({"odd"}, V_ASN1_BMPSTRING), "");
}

TEST(KeptCertificate, TellsSubjectIssuerAndDates) {
    setenv("TZ", "UTC0", 1);
    tzset();
    const tls::Identity authority = tls::MakeAuthority("Test CA");
    tls::CertSpec spec;
    spec.common_names = {"nas.example"};
    const time_t now = time(nullptr);
    KeepCertificate(tls::Parse(tls::Make(spec, &authority).certificate).get());
    const Json::Value kept = KeptCertificate();
    EXPECT_EQ(kept["subject"], "nas.example");
    EXPECT_EQ(kept["issuer"], "Test CA");
    EXPECT_NEAR(kept["availDate"].asDouble(), static_cast<double>(now - 3600), 5);
    EXPECT_NEAR(kept["expDate"].asDouble(), static_cast<double>(now + 24 * 3600), 5);
    EXPECT_EQ(kept.size(), 4U);
}

TEST(KeptCertificate, SurvivesThePathToTheWebPageWhateverItsName) {
    tls::CertSpec spec;
    spec.common_names = {std::string("a\0\"\n\x01", 5)};
    KeepCertificate(tls::Parse(tls::Make(spec).certificate).get());
    Json::Value back;
    ASSERT_TRUE(json::fromString(back, json::toString(KeptCertificate())));
    EXPECT_EQ(back["subject"].asString(), spec.common_names[0]);
}

TEST(KeptCertificate, IsForgotten) {
    KeepCertificate(tls::Parse(tls::Make({}).certificate).get());
    KeepCertificate(nullptr);
    EXPECT_TRUE(KeptCertificate().isNull());
}

TEST(KeptCertificate, MayBeWrittenByTwoTransfersAtOnce) {
    const auto certificate = tls::Parse(tls::Make({}).certificate);
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] {
            for (int round = 0; round < 200; ++round) {
                KeepCertificate(certificate.get());
                EXPECT_EQ(KeptCertificate()["subject"], "localhost");
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

}  // namespace
}  // namespace ZYROVFS
