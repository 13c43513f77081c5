#include <gtest/gtest.h>

#include "support/seams.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {
namespace {

using namespace Utils;

TEST(CloudTypeFromUri, OfAnyOtherSchemeIsVfsAndWithoutASchemeIsUnknown) {
    EXPECT_EQ(GetCloudTypeFromURI("ftp://host"), CLOUD_TYPE_VFS);
    EXPECT_EQ(GetCloudTypeFromURI("davs://host/a"), CLOUD_TYPE_VFS);
    EXPECT_EQ(GetCloudTypeFromURI("://"), CLOUD_TYPE_VFS);
    EXPECT_EQ(GetCloudTypeFromURI("host/share"), CLOUD_TYPE_UNKNOWN);
    EXPECT_EQ(GetCloudTypeFromURI("box:/x"), CLOUD_TYPE_UNKNOWN);
    EXPECT_EQ(GetCloudTypeFromURI(""), CLOUD_TYPE_UNKNOWN);
}

TEST(CloudTypeFromUri, OfEverySchemeThatBeginsOnedriveIsOneDriveAndOnedrAloneIsTheShortOne) {
    EXPECT_EQ(GetCloudTypeFromURI("onedrive://x"), CLOUD_TYPE_ONEDRIVE);
    EXPECT_EQ(GetCloudTypeFromURI("onedrive2://x"), CLOUD_TYPE_ONEDRIVE);
    EXPECT_EQ(GetCloudTypeFromURI("onedr://x"), CLOUD_TYPE_ONEDRIVE_SHORT);
    EXPECT_EQ(GetCloudTypeFromURI("onedriv://x"), CLOUD_TYPE_ONEDRIVE_SHORT);
    EXPECT_EQ(GetCloudTypeFromURI("oned://x"), CLOUD_TYPE_VFS);
}

TEST(CloudTypeFromUri, LooksAtCapitals) {
    EXPECT_EQ(GetCloudTypeFromURI("Box://x"), CLOUD_TYPE_VFS);
    EXPECT_EQ(GetCloudTypeFromURI("GOOGLE://x"), CLOUD_TYPE_VFS);
}

TEST(CloudTypeFromUri, IsThatOfTheFirstPrefixThatFits) {
    EXPECT_EQ(GetCloudTypeFromURI("google://amy@example.com/a"), CLOUD_TYPE_GOOGLE);
    EXPECT_EQ(GetCloudTypeFromURI("dropbox://amy@example.com"), CLOUD_TYPE_DROPBOX);
    EXPECT_EQ(GetCloudTypeFromURI("box://amy@example.com"), CLOUD_TYPE_BOX);
    EXPECT_EQ(GetCloudTypeFromURI("boxnet://x"), CLOUD_TYPE_BOX);
    EXPECT_EQ(GetCloudTypeFromURI("hubic://x"), CLOUD_TYPE_HUBIC);
    EXPECT_EQ(GetCloudTypeFromURI("awss3://x"), CLOUD_TYPE_AWSS3);
    EXPECT_EQ(GetCloudTypeFromURI("aws://x"), CLOUD_TYPE_VFS);
    EXPECT_EQ(GetCloudTypeFromURI("ftp://box://x"), CLOUD_TYPE_VFS);
}

TEST(Escape, PutsABackslashBeforeTheQuoteAndLeavesBackslashesSingle) {
    EXPECT_EQ(EscapeSingleQuote("it's"), "it\\'s");
    EXPECT_EQ(EscapeSingleQuote("a\\b"), "a\\b");
    EXPECT_EQ(EscapeSingleQuote("end\\"), "end\\");
    EXPECT_EQ(EscapeSingleQuote("\\'"), "\\\\'");
    EXPECT_EQ(EscapeDoubleQuote("say \"hi\""), "say \\\"hi\\\"");
    EXPECT_EQ(EscapeDoubleQuote("a\\b"), "a\\b");
}

TEST(Escape, TouchesNoOtherCharacter) {
    const std::string odd("gr\xc3\xbc\xc3\x9f\0\n\t%&", 11);
    EXPECT_EQ(EscapeSingleQuote(odd + "\""), odd + "\"");
    EXPECT_EQ(EscapeDoubleQuote(odd + "'"), odd + "'");
    EXPECT_EQ(EscapeSingleQuote(""), "");
    EXPECT_EQ(EscapeDoubleQuote(""), "");
}

}  // namespace
}  // namespace ZYROCloud
