#include "name.h"

#include <gmock/gmock.h>

#include "failure.h"
#include "request.h"

namespace {

using web::Attachment;
using web::CheckName;
using web::CheckPath;
using web::IsWithin;
using web::Join;
using web::SplitPath;

int StatusOf(const std::function<void()>& call) {
    try {
        call();
    } catch (const web::Failure& failure) {
        return failure.Status();
    }
    return 200;
}

TEST(WebName, NamesAreOneToTwoHundredAndFiftyFiveBytesOfText) {
    for (const std::string& name : std::vector<std::string>{
             "a", "...", ".hidden", "with blank", "\"quoted\"", "new\nline", "\x01", "100%",
             "grüße", "😀", std::string(255, 'n'), "back\\slash", "..\\.."}) {
        EXPECT_EQ(StatusOf([&] { CheckName(name); }), 200) << name;
    }
    for (const std::string& name : std::vector<std::string>{
             "", ".", "..", "a/b", "/", std::string("a\0b", 3), std::string(256, 'n'), "\xff",
             "\xc0\xaf", "\xed\xa0\x80", "\xf4\x90\x80\x80", "\xe2\x82", "\xc3"}) {
        EXPECT_EQ(StatusOf([&] { CheckName(name); }), 422) << name;
        EXPECT_FALSE(web::IsName(name));
    }
}

TEST(WebName, PathsLeadDownOnly) {
    for (const char* path : {"/", "/a", "/a/b c/…", "/.../x"}) {
        EXPECT_EQ(StatusOf([&] { CheckPath(path); }), 200) << path;
    }
    for (const char* path :
         {"", "a", "/..", "/a/..", "/a/../b", "/.", "//", "/a//b", "/a/", "a/b"}) {
        EXPECT_EQ(StatusOf([&] { CheckPath(path); }), 422) << path;
    }
    EXPECT_EQ(StatusOf([] { CheckPath("/" + std::string(4096, 'x')); }), 422);
}

TEST(WebName, APathIsCutIntoFolderAndName) {
    EXPECT_EQ(SplitPath("/a").folder, "/");
    EXPECT_EQ(SplitPath("/a/b").folder, "/a");
    EXPECT_EQ(SplitPath("/a/b").name, "b");
    EXPECT_EQ(StatusOf([] { SplitPath("/"); }), 422);
    EXPECT_EQ(Join("/", "a"), "/a");
    EXPECT_EQ(Join("/a", "b"), "/a/b");
    EXPECT_EQ(StatusOf([] { Join("/a", ".."); }), 422);
}

TEST(WebName, WhatLiesWithinAFolderIsKnownByWholeNames) {
    EXPECT_TRUE(IsWithin("/a", "/a"));
    EXPECT_TRUE(IsWithin("/a/b/c", "/a"));
    EXPECT_TRUE(IsWithin("/a", "/"));
    EXPECT_FALSE(IsWithin("/ab", "/a"));
    EXPECT_FALSE(IsWithin("/a", "/a/b"));
}

TEST(WebName, EveryPrintableByteComesBackFromTheDisposition) {
    std::string all;
    for (int c = 1; c < 128; ++c) {
        all += c == '/' ? "" : std::string(1, static_cast<char>(c));
    }
    for (const std::string& name : {all, std::string("grüße 😀 \"x\" 'y'\r\nSet-Cookie: a=b")}) {
        const std::string header = Attachment(name);
        const std::string start = "attachment; filename*=UTF-8''";
        ASSERT_EQ(header.substr(0, start.size()), start);
        const std::string escaped = header.substr(start.size());
        EXPECT_EQ(escaped.find_first_not_of("abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ"
                                            "0123456789-._%"),
                  std::string::npos)
            << "nothing can end the header: " << escaped;
        EXPECT_EQ(web::Unescape(escaped), name);
    }
}

}  // namespace
