#include "cloud_item.h"

#include <algorithm>
#include <iterator>

#include "body.h"

namespace web {
namespace {

struct Format {
    const char* type;
    const char* title;
    const char* extension;
};

/** In the order in which a person is likely to want them; what is not here is shown by its type. */
constexpr Format kFormats[] = {
    {"application/vnd.openxmlformats-officedocument.wordprocessingml.document", "Word", ".docx"},
    {"application/vnd.openxmlformats-officedocument.spreadsheetml.sheet", "Excel", ".xlsx"},
    {"application/vnd.openxmlformats-officedocument.presentationml.presentation", "PowerPoint",
     ".pptx"},
    {"application/pdf", "PDF", ".pdf"},
    {"application/vnd.oasis.opendocument.text", "OpenDocument text", ".odt"},
    {"application/x-vnd.oasis.opendocument.spreadsheet", "OpenDocument spreadsheet", ".ods"},
    {"application/vnd.oasis.opendocument.spreadsheet", "OpenDocument spreadsheet", ".ods"},
    {"application/vnd.oasis.opendocument.presentation", "OpenDocument presentation", ".odp"},
    {"application/rtf", "Rich text", ".rtf"},
    {"application/epub+zip", "EPUB", ".epub"},
    {"text/csv", "CSV", ".csv"},
    {"text/tab-separated-values", "TSV", ".tsv"},
    {"text/plain", "Plain text", ".txt"},
    {"text/html", "Web page", ".html"},
    {"application/zip", "Web page (ZIP)", ".zip"},
    {"image/svg+xml", "SVG picture", ".svg"},
    {"image/png", "PNG picture", ".png"},
    {"image/jpeg", "JPEG picture", ".jpg"},
    {"application/vnd.google-apps.script+json", "Script", ".json"},
};

size_t RankOf(const std::string& type) {
    return static_cast<size_t>(
        std::find_if(std::begin(kFormats), std::end(kFormats),
                     [&](const Format& format) { return type == format.type; }) -
        std::begin(kFormats));
}

Export ExportAs(const std::string& type) {
    const size_t rank = RankOf(type);
    return rank == std::size(kFormats)
               ? Export{type, type, ""}
               : Export{type, kFormats[rank].title, kFormats[rank].extension};
}

}  // namespace

std::string AttributeOf(GFileInfo* info, const char* name) {
    const char* text = g_file_info_get_attribute_string(info, name);
    return text == nullptr ? "" : text;
}

std::vector<Export> ExportsOf(const std::string& description) {
    const Json::Value document = ParseObject(description);
    if (!document.isObject() || !document["exportLinks"].isObject()) {
        return {};
    }
    std::vector<std::string> types = document["exportLinks"].getMemberNames();
    std::stable_sort(types.begin(), types.end(),
                     [](const auto& a, const auto& b) { return RankOf(a) < RankOf(b); });
    std::vector<Export> exports;
    exports.reserve(types.size());
    for (const std::string& type : types) {
        exports.push_back(ExportAs(type));
    }
    return exports;
}

Entry EntryOf(GFileInfo* info) {
    Entry entry;
    if (g_file_info_has_attribute(info, G_FILE_ATTRIBUTE_STANDARD_NAME)) {
        entry.name = g_file_info_get_name(info);
    }
    entry.folder = g_file_info_get_file_type(info) == G_FILE_TYPE_DIRECTORY;
    entry.file = !entry.folder;
    entry.size = entry.folder ? 0 : g_file_info_get_size(info);
    const guint64 modified = g_file_info_get_attribute_uint64(info, G_FILE_ATTRIBUTE_TIME_MODIFIED);
    entry.modified = modified == 0 ? -1 : static_cast<long long>(modified);
    if (entry.file) {
        entry.exports = ExportsOf(AttributeOf(info, G_FILE_ATTRIBUTE_STANDARD_DESCRIPTION));
    }
    return entry;
}

}  // namespace web
