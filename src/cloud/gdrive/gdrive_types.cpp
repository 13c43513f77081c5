#include "cloud/gdrive/gdrive_types.h"

#include <strings.h>

#include <algorithm>
#include <cstring>
#include <iterator>

namespace ZYROCloud::gdrive {
namespace {

constexpr DocumentType kDocuments[] = {
    {".gdoc", "application/vnd.google-apps.document"},
    {".gdraw", "application/vnd.google-apps.drawing"},
    {".gform", "application/vnd.google-apps.form"},
    {".gslides", "application/vnd.google-apps.presentation"},
    {".gsheet", "application/vnd.google-apps.spreadsheet"},
    {".gtable", "application/vnd.google-apps.fusiontable"},
    {".gscript", "application/vnd.google-apps.script"},
};

struct UploadType {
    const char* extension;
    const char* mime_type;
};

constexpr UploadType kUploads[] = {
    {"docx", "application/vnd.openxmlformats-officedocument.wordprocessingml.document"},
    {"docm", "application/vnd.ms-word.document.macroEnabled.12"},
    {"dotx", "application/vnd.openxmlformats-officedocument.wordprocessingml.template"},
    {"dotm", "application/vnd.ms-word.template.macroEnabled.12"},
    {"xlsx", "application/vnd.openxmlformats-officedocument.spreadsheetml.sheet"},
    {"xlsm", "application/vnd.ms-excel.sheet.macroEnabled.12"},
    {"xltx", "application/vnd.openxmlformats-officedocument.spreadsheetml.template"},
    {"xltm", "application/vnd.ms-excel.template.macroEnabled.12"},
    {"xlsb", "application/vnd.ms-excel.sheet.binary.macroEnabled.12"},
    {"xlam", "application/vnd.ms-excel.addin.macroEnabled.12"},
    {"pptx", "application/vnd.openxmlformats-officedocument.presentationml.presentation"},
    {"pptm", "application/vnd.ms-powerpoint.presentation.macroEnabled.12"},
    {"ppsx", "application/vnd.openxmlformats-officedocument.presentationml.slideshow"},
    {"ppsm", "application/vnd.ms-powerpoint.slideshow.macroEnabled.12"},
    {"potx", "application/vnd.openxmlformats-officedocument.presentationml.template"},
    {"potm", "application/vnd.ms-powerpoint.template.macroEnabled.12"},
    {"ppam", "application/vnd.ms-powerpoint.addin.macroEnabled.12"},
    {"sldx", "application/vnd.openxmlformats-officedocument.presentationml.slide"},
    {"sldm", "application/vnd.ms-powerpoint.slide.macroEnabled.12"},
    {"odp", "application/vnd.oasis.opendocument.presentation"},
    {"otp", "application/vnd.oasis.opendocument.presentation-template"},
    {"ods", "application/vnd.oasis.opendocument.spreadsheet"},
    {"ots", "application/vnd.oasis.opendocument.spreadsheet-template"},
    {"odt", "application/vnd.oasis.opendocument.text"},
    {"odm", "application/vnd.oasis.opendocument.text-master"},
    {"ott", "application/vnd.oasis.opendocument.text-template"},
    {"oth", "application/vnd.oasis.opendocument.text-web"},
};

/** The first row of a table that `fits`, or null. */
template <typename Row, size_t N, typename Fits>
const Row* FindRow(const Row (&table)[N], Fits fits) {
    const Row* row = std::find_if(std::begin(table), std::end(table), fits);
    return row == std::end(table) ? nullptr : row;
}

/** Without regard to case in ASCII; a NUL ends no text. */
bool SameExtension(const std::string& extension, const char* known) {
    return extension.size() == strlen(known) && strcasecmp(extension.c_str(), known) == 0;
}

}  // namespace

const DocumentType* FindDocumentByExtension(const std::string& extension) {
    return FindRow(kDocuments, [&](const DocumentType& row) { return extension == row.extension; });
}

const DocumentType* FindDocumentByType(const std::string& mime_type) {
    return FindRow(kDocuments, [&](const DocumentType& row) { return mime_type == row.mime_type; });
}

const char* FindUploadType(const std::string& title) {
    const std::string ending = ExtensionOf(title);
    if (ending.empty()) {
        return nullptr;
    }
    const std::string extension = ending.substr(1);
    const UploadType* type = FindRow(kUploads, [&extension](const UploadType& row) {
        return SameExtension(extension, row.extension);
    });
    return type == nullptr ? nullptr : type->mime_type;
}

std::string ExtensionOf(const std::string& name) {
    const size_t dot = name.rfind('.');
    return dot == std::string::npos ? "" : name.substr(dot);
}

}  // namespace ZYROCloud::gdrive
