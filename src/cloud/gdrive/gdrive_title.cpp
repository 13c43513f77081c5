#include "cloud/gdrive/gdrive_title.h"

#include <cstring>

#include "cloud/gdrive/gdrive_types.h"
#include "zyrovfs/cloud_utils.h"
#include "zyrovfs/utils.h"

namespace ZYROCloud::gdrive {
namespace {

constexpr const char* kDateMark = " - ";

bool IsDate(const std::string& text) {
    timeval time{};
    return !text.empty() && ZYROVFS::Utils::ParseRFC3339ToTime(text, time);
}

std::string TitleIs(const std::string& title) {
    return "title='" + Utils::EscapeSingleQuote(title) + "'";
}

}  // namespace

ShownTitle::ShownTitle(const std::string& name) : name_(name) {
    const std::string extension = ExtensionOf(name);
    if (FindDocumentByExtension(extension) == nullptr) {
        TakeDate(name);
        return;
    }
    const std::string stem = name.substr(0, name.size() - extension.size());
    TakeDate(stem);
    if (other_.empty()) {
        other_ = stem;
    }
}

/**
 * The extension is that of the stem even where the stem is what a document's extension was taken
 * from. A date with a fraction then loses it to the extension and counts as none.
 */
void ShownTitle::TakeDate(const std::string& stem) {
    const size_t mark = stem.find(kDateMark);
    if (mark == std::string::npos || mark == 0) {
        return;
    }
    const std::string extension = ExtensionOf(stem);
    const size_t begin = mark + strlen(kDateMark);
    const size_t end = stem.size() - extension.size();
    const std::string date = begin < end ? stem.substr(begin, end - begin) : "";
    if (IsDate(date)) {
        other_ = stem.substr(0, mark) + extension;
        date_ = date;
    }
}

std::string ShownTitle::Query(const std::string& extra) const {
    std::string query = TitleIs(name_);
    if (!other_.empty()) {
        query += " or " + TitleIs(other_);
    }
    if (!extra.empty()) {
        query += " and (" + extra + ") and trashed=false";
    }
    return query;
}

/** Titles are kept as uploads escape them, so they compare in that form. */
bool ShownTitle::Means(const Json::Value& item) const {
    const std::string title = item["title"].asString();
    if (date_.empty() && title == Utils::EscapeDoubleQuote(name_)) {
        return true;
    }
    return !other_.empty() && title == Utils::EscapeDoubleQuote(other_) &&
           item.get("createdDate", "").asString() == date_;
}

}  // namespace ZYROCloud::gdrive
