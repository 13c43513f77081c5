#include "cloud/gdrive/gdrive_types.h"

#include <gtest/gtest.h>

namespace ZYROCloud::gdrive {
namespace {

struct Pair {
    const char* extension;
    const char* type;
};

TEST(GDriveDocuments, HaveOneExtensionForEachKind) {
    constexpr Pair rows[] = {{".gdoc", "document"},      {".gdraw", "drawing"},
                             {".gform", "form"},         {".gslides", "presentation"},
                             {".gsheet", "spreadsheet"}, {".gtable", "fusiontable"},
                             {".gscript", "script"}};
    for (const Pair& row : rows) {
        const std::string type = std::string("application/vnd.google-apps.") + row.type;
        const DocumentType* found = FindDocumentByExtension(row.extension);
        ASSERT_NE(found, nullptr) << row.extension;
        EXPECT_EQ(found->mime_type, type);
        EXPECT_EQ(FindDocumentByType(type), found);
    }
}

TEST(GDriveDocuments, AreComparedWithCaseAndWhole) {
    for (const char* extension : {"", ".", "gdoc", ".GDOC", ".gdocx", ".gdo", ".doc"}) {
        EXPECT_EQ(FindDocumentByExtension(extension), nullptr) << extension;
    }
    EXPECT_EQ(FindDocumentByExtension(std::string(".gdoc\0", 6)), nullptr);
    for (const char* type : {"", "application/vnd.google-apps.folder", "text/plain",
                             "Application/vnd.google-apps.document"}) {
        EXPECT_EQ(FindDocumentByType(type), nullptr) << type;
    }
}

TEST(GDriveUploads, OfOfficeFilesTellTheirType) {
    const std::string office = "application/vnd.openxmlformats-officedocument.";
    const std::string open = "application/vnd.oasis.opendocument.";
    const std::string ms = "application/vnd.ms-";
    const std::pair<const char*, std::string> rows[] = {
        {"docx", office + "wordprocessingml.document"},
        {"docm", ms + "word.document.macroEnabled.12"},
        {"dotx", office + "wordprocessingml.template"},
        {"dotm", ms + "word.template.macroEnabled.12"},
        {"xlsx", office + "spreadsheetml.sheet"},
        {"xlsm", ms + "excel.sheet.macroEnabled.12"},
        {"xltx", office + "spreadsheetml.template"},
        {"xltm", ms + "excel.template.macroEnabled.12"},
        {"xlsb", ms + "excel.sheet.binary.macroEnabled.12"},
        {"xlam", ms + "excel.addin.macroEnabled.12"},
        {"pptx", office + "presentationml.presentation"},
        {"pptm", ms + "powerpoint.presentation.macroEnabled.12"},
        {"ppsx", office + "presentationml.slideshow"},
        {"ppsm", ms + "powerpoint.slideshow.macroEnabled.12"},
        {"potx", office + "presentationml.template"},
        {"potm", ms + "powerpoint.template.macroEnabled.12"},
        {"ppam", ms + "powerpoint.addin.macroEnabled.12"},
        {"sldx", office + "presentationml.slide"},
        {"sldm", ms + "powerpoint.slide.macroEnabled.12"},
        {"odp", open + "presentation"},
        {"otp", open + "presentation-template"},
        {"ods", open + "spreadsheet"},
        {"ots", open + "spreadsheet-template"},
        {"odt", open + "text"},
        {"odm", open + "text-master"},
        {"ott", open + "text-template"},
        {"oth", open + "text-web"},
    };
    for (const auto& [extension, type] : rows) {
        EXPECT_EQ(FindUploadType(std::string("a.b.") + extension), type) << extension;
    }
}

TEST(GDriveUploads, TheExtensionDOCXFindsItsTypeSinceCaseDoesNotCount) {
    EXPECT_STREQ(FindUploadType("Report.DOCX"), FindUploadType("report.docx"));
    EXPECT_STREQ(FindUploadType(".Odt"), "application/vnd.oasis.opendocument.text");
}

TEST(GDriveUploads, OfOtherFilesTellNothing) {
    for (const char* title : {"", ".", "docx", "a.doc", "a.docx.", "a.docx ", "a.docxx", "a.txt"}) {
        EXPECT_EQ(FindUploadType(title), nullptr) << title;
    }
    EXPECT_EQ(FindUploadType(std::string("a.docx\0.txt", 11)), nullptr);
    EXPECT_EQ(FindUploadType(std::string("a.docx\0", 7)), nullptr);
}

TEST(GDriveExtension, IsWhatTheLastDotBegins) {
    constexpr Pair rows[] = {{"a.txt", ".txt"}, {"a.b.c", ".c"}, {"a.", "."},
                             {".x", ".x"},      {"a", ""},       {"", ""}};
    for (const Pair& row : rows) {
        EXPECT_EQ(ExtensionOf(row.extension), row.type) << row.extension;
    }
}

}  // namespace
}  // namespace ZYROCloud::gdrive
