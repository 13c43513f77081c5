#include "media.h"

#include <strings.h>

namespace web {
namespace {

/** SVG is not among them: it carries scripts. */
constexpr struct {
    const char* extension;
    const char* type;
} kTypes[] = {
    {"avif", "image/avif"}, {"gif", "image/gif"},       {"jpeg", "image/jpeg"},
    {"jpg", "image/jpeg"},  {"png", "image/png"},       {"webp", "image/webp"},
    {"mp4", "video/mp4"},   {"m4v", "video/mp4"},       {"webm", "video/webm"},
    {"ogv", "video/ogg"},   {"mov", "video/quicktime"}, {"flac", "audio/flac"},
    {"m4a", "audio/mp4"},   {"mp3", "audio/mpeg"},      {"oga", "audio/ogg"},
    {"ogg", "audio/ogg"},   {"opus", "audio/ogg"},      {"wav", "audio/wav"},
};

}  // namespace

std::string ViewableType(const std::string& name) {
    const size_t dot = name.rfind('.');
    const std::string extension = dot == std::string::npos ? "" : name.substr(dot + 1);
    for (const auto& row : kTypes) {
        if (strcasecmp(extension.c_str(), row.extension) == 0) {
            return row.type;
        }
    }
    return "";
}

}  // namespace web
