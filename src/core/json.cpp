#include "core/json.h"

#include <json/reader.h>
#include <json/writer.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cmath>
#include <memory>
#include <sstream>

#include "core/entry_name.h"
#include "core/owned_folder.h"

namespace ZYROVFS::json {
namespace {

// Far beyond any document of ours, far below what would exhaust the memory of the box.
constexpr size_t kLargestDocument = 64 << 20;
// Levels of nesting that the reader takes; each costs stack.
constexpr int kMostLevels = 1000;

const Json::CharReaderBuilder& ReaderRules() {
    static const Json::CharReaderBuilder rules = [] {
        Json::CharReaderBuilder builder;
        builder["failIfExtra"] = true;
        builder["stackLimit"] = kMostLevels;
        // Written into one line, a comment would swallow what stands behind it.
        builder["collectComments"] = false;
        return builder;
    }();
    return rules;
}

Json::StreamWriterBuilder OneLine(bool utf8) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = utf8;
    builder["commentStyle"] = "None";
    return builder;
}

const Json::StreamWriterBuilder& WriterRules() {
    // Escaping would replace what is not valid UTF-8; names and passwords keep their bytes.
    static const Json::StreamWriterBuilder rules = OneLine(true);
    return rules;
}

bool Parse(const char* begin, const char* end, Json::Value& value) {
    try {
        // Making a reader, or a writer below, costs more than most texts do.
        static thread_local const std::unique_ptr<Json::CharReader> reader(
            ReaderRules().newCharReader());
        if (reader->parse(begin, end, &value, nullptr)) {
            return true;
        }
    } catch (const std::exception&) {
        // Nesting beyond the reader's limit arrives as an exception: bad JSON as any other.
    }
    value = Json::Value();
    errno = EINVAL;
    return false;
}

/** Whether the reader takes back what is written of this value: no infinite number, and no deeper
 * nesting than it allows. Far cheaper than reading the text back. */
bool CanBeReadBack(const Json::Value& value, int levels) {
    if (value.type() == Json::realValue) {
        return std::isfinite(value.asDouble());
    }
    if (levels == 0) {
        return false;
    }
    return std::all_of(value.begin(), value.end(), [levels](const Json::Value& inner) {
        return CanBeReadBack(inner, levels - 1);
    });
}

template <typename T>
bool FromDecimal(const std::string& text, T& number) {
    T parsed{};
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), parsed);
    if (error != std::errc() || end != text.data() + text.size()) {
        return false;
    }
    number = parsed;
    return true;
}

}  // namespace

bool fromFile(Json::Value& value, const OwnedFolder& folder, const std::string& name) try {
    value = Json::Value();
    std::string text;
    return folder.Read(name, kLargestDocument, text) &&
           Parse(text.data(), text.data() + text.size(), value);
} catch (const std::exception&) {
    errno = ENOMEM;
    return false;
}

bool fromFile(Json::Value& value, const std::string& path) try {
    value = Json::Value();
    const EntryPath place = SplitPath(path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, geteuid());
    return folder && fromFile(value, folder, place.name);
} catch (const std::exception&) {
    errno = ENOMEM;
    return false;
}

bool toFile(const Json::Value& value, const OwnedFolder& folder, const std::string& name,
            mode_t mode, FileOwner owner) try {
    // What cannot be read back must not replace what can.
    if (!CanBeReadBack(value, kMostLevels)) {
        errno = EINVAL;
        return false;
    }
    const std::string text = toString(value) + "\n";
    if (text.size() > kLargestDocument) {
        errno = EFBIG;
        return false;
    }
    return folder.Replace(name, text, mode, owner);
} catch (const std::exception&) {
    errno = ENOMEM;
    return false;
}

bool toFile(const Json::Value& value, const std::string& path, mode_t mode, FileOwner owner) try {
    const EntryPath place = SplitPath(path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, geteuid());
    return folder && toFile(value, folder, place.name, mode, owner);
} catch (const std::exception&) {
    errno = ENOMEM;
    return false;
}

bool fromString(Json::Value& value, const std::string& text) {
    value = Json::Value();
    return Parse(text.data(), text.data() + text.size(), value);
}

std::string toString(const Json::Value& value) {
    static thread_local const std::unique_ptr<Json::StreamWriter> writer(
        WriterRules().newStreamWriter());
    static thread_local std::ostringstream stream;
    stream.str("");
    writer->write(value, &stream);
    std::string text = stream.str();
    stream.str("");
    return text;
}

std::string toAscii(const Json::Value& value) {
    constexpr char kDelete = 0x7f;
    static const Json::StreamWriterBuilder rules = OneLine(false);
    std::string text = Json::writeString(rules, value);
    // The writer counts it as printable.
    for (size_t at = 0; (at = text.find(kDelete, at)) != std::string::npos;) {
        text.replace(at, 1, "\\u007f");
    }
    return text;
}

bool toInt64(const Json::Value& value, int64_t& number) {
    if (value.isString()) {
        return FromDecimal(value.asString(), number);
    }
    if (!value.isInt64()) {
        return false;
    }
    number = value.asInt64();
    return true;
}

bool toUInt64(const Json::Value& value, uint64_t& number) {
    if (value.isString()) {
        return FromDecimal(value.asString(), number);
    }
    if (!value.isUInt64()) {
        return false;
    }
    number = value.asUInt64();
    return true;
}

}  // namespace ZYROVFS::json
