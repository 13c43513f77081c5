#include "support/cloudsim/gdrive_types.h"

#include "support/cloudsim/route.h"

namespace cloudsim::gdrive {
namespace {

using Formats = std::map<std::string, std::string>;

constexpr const char* kOffice = "application/vnd.openxmlformats-officedocument.";
constexpr const char* kPrefix = "application/vnd.google-apps.";

const std::map<std::string, Formats>& AllFormats() {
    static const std::map<std::string, Formats> formats = {
        {"document",
         {{std::string(kOffice) + "wordprocessingml.document", "docx"},
          {"application/vnd.oasis.opendocument.text", "odt"},
          {"application/rtf", "rtf"},
          {"application/pdf", "pdf"},
          {"text/html", "html"},
          {"text/plain", "txt"}}},
        {"spreadsheet",
         {{std::string(kOffice) + "spreadsheetml.sheet", "xlsx"},
          {"application/x-vnd.oasis.opendocument.spreadsheet", "ods"},
          {"application/pdf", "pdf"},
          {"text/csv", "csv"}}},
        {"presentation",
         {{std::string(kOffice) + "presentationml.presentation", "pptx"},
          {"application/pdf", "pdf"},
          {"text/plain", "txt"}}},
        {"drawing",
         {{"image/svg+xml", "svg"},
          {"image/png", "png"},
          {"image/jpeg", "jpeg"},
          {"application/pdf", "pdf"}}},
        {"script", {{"application/vnd.google-apps.script+json", "json"}}},
    };
    return formats;
}

const Formats kTypesOfTitles = {
    {"txt", "text/plain"},         {"html", "text/html"},      {"csv", "text/csv"},
    {"jpg", "image/jpeg"},         {"jpeg", "image/jpeg"},     {"png", "image/png"},
    {"gif", "image/gif"},          {"pdf", "application/pdf"}, {"zip", "application/zip"},
    {"mp3", "audio/mpeg"},         {"mp4", "video/mp4"},       {"json", "application/json"},
    {"doc", "application/msword"},
};

}  // namespace

std::string MimeType(const Node& node) {
    return node.folder              ? kFolderType
           : node.mime_type.empty() ? MimeTypeOfTitle(node.name)
                                    : node.mime_type;
}

bool IsDocument(const Node& node) {
    return !node.folder && BeginsWith(node.mime_type, kPrefix);
}

std::string MimeTypeOfTitle(const std::string& title) {
    const size_t dot = title.rfind('.');
    const auto known = dot == std::string::npos
                           ? kTypesOfTitles.end()
                           : kTypesOfTitles.find(FoldCase(title.substr(dot + 1)));
    return known == kTypesOfTitles.end() ? "application/octet-stream" : known->second;
}

const std::map<std::string, std::string>& ExportFormats(const std::string& document_type) {
    static const Formats none;
    const auto formats = BeginsWith(document_type, kPrefix)
                             ? AllFormats().find(document_type.substr(document_type.rfind('.') + 1))
                             : AllFormats().end();
    return formats == AllFormats().end() ? none : formats->second;
}

std::string ExportType(const std::string& format) {
    for (const auto& [kind, formats] : AllFormats()) {
        for (const auto& [mime_type, word] : formats) {
            if (word == format) {
                return mime_type;
            }
        }
    }
    return "";
}

}  // namespace cloudsim::gdrive
