#include "support/cloudsim/http.h"

#include <json/reader.h>
#include <json/writer.h>
#include <openssl/rand.h>
#include <strings.h>

#include <algorithm>
#include <cstdlib>

namespace cloudsim {
namespace {

struct Span {
    uint64_t first, last;
};

/** "bytes=1-5", "bytes=5-", "bytes=-5". Nothing when it is no range that could be met. */
std::optional<Span> ParseRange(const std::string& text, uint64_t size) {
    const size_t dash = text.find('-');
    if (text.compare(0, 6, "bytes=") != 0 || dash == std::string::npos || size == 0) {
        return std::nullopt;
    }
    const std::string from = text.substr(6, dash - 6), to = text.substr(dash + 1);
    const auto first = ParseNumber(from), last = ParseNumber(to);
    if (from.empty()) {
        return last && *last != 0 ? std::optional<Span>({size - std::min(*last, size), size - 1})
                                  : std::nullopt;
    }
    if (!first || *first >= size || (!to.empty() && (!last || *last < *first))) {
        return std::nullopt;
    }
    return Span{*first, to.empty() ? size - 1 : std::min(*last, size - 1)};
}

class Collector : public Handler {
  public:
    Collector(std::function<Reply(const std::string&)> answer, size_t limit)
        : answer_(std::move(answer)), limit_(limit) {}
    void Data(const char* data, size_t size) override {
        too_large_ = too_large_ || body_.size() + size > limit_;
        if (!too_large_) {
            body_.append(data, size);
        }
    }
    Reply Finish() override { return too_large_ ? Reply(413) : answer_(body_); }

  private:
    const std::function<Reply(const std::string&)> answer_;
    const size_t limit_;
    std::string body_;
    bool too_large_ = false;
};

class ReadyAnswer : public Handler {
  public:
    explicit ReadyAnswer(Reply reply) : reply_(std::move(reply)) {}
    void Data(const char*, size_t) override {}
    Reply Finish() override { return reply_; }

  private:
    const Reply reply_;
};

}  // namespace

std::string Request::Header(const std::string& name) const {
    return FindHeader(headers, name);
}

std::string Request::Query(const std::string& name, const std::string& missing) const {
    for (const auto& [key, value] : query) {
        if (key == name) {
            return value;
        }
    }
    return missing;
}

bool Request::HasQuery(const std::string& name) const {
    return std::any_of(query.begin(), query.end(), [&](auto& pair) { return pair.first == name; });
}

std::string Request::BearerToken() const {
    const std::string value = Header("Authorization");
    return SameText(value.substr(0, 7), "Bearer ") ? value.substr(7) : "";
}

std::vector<std::string> Request::Segments() const {
    std::vector<std::string> segments;
    size_t start = 0;
    while (start < path.size()) {
        const size_t end = std::min(path.find('/', start), path.size());
        if (end > start) {
            segments.push_back(PercentDecode(path.substr(start, end - start), false));
        }
        start = end + 1;
    }
    return segments;
}

Reply::Reply(int code, std::string text, const std::string& type) : status(code) {
    With("Content-Type", type);
    SetBody(std::move(text));
}

Reply& Reply::With(const std::string& name, const std::string& value) {
    headers.emplace_back(name, value);
    return *this;
}

void Reply::SetBody(std::string text) {
    offset = 0;
    length = text.size();
    content = MakeBytes(std::move(text));
}

Reply JsonReply(int status, const Json::Value& document) {
    return {status, OneLine(document), "application/json"};
}

Reply ContentReply(const Request& request, ContentPtr content, const std::string& type) {
    const uint64_t size = content->Size();
    const std::string range = request.Header("Range");
    Reply reply;
    reply.With("Content-Type", type).With("Accept-Ranges", "bytes");
    reply.length = size;
    if (range.compare(0, 6, "bytes=") == 0) {
        const auto span = ParseRange(range, size);
        if (!span) {
            return Reply(416).With("Content-Range", "bytes */" + std::to_string(size));
        }
        reply.status = 206;
        reply.offset = span->first;
        reply.length = span->last - span->first + 1;
        reply.With("Content-Range", "bytes " + std::to_string(span->first) + "-" +
                                        std::to_string(span->last) + "/" + std::to_string(size));
    }
    reply.content = std::move(content);
    return reply;
}

std::unique_ptr<Handler> Collect(std::function<Reply(const std::string& body)> answer,
                                 size_t limit) {
    return std::make_unique<Collector>(std::move(answer), limit);
}

std::unique_ptr<Handler> Ready(Reply reply) {
    return std::make_unique<ReadyAnswer>(std::move(reply));
}

bool SameText(const std::string& a, const std::string& b) {
    return a.size() == b.size() && strncasecmp(a.data(), b.data(), a.size()) == 0;
}

std::string FindHeader(const Headers& headers, const std::string& name) {
    for (const auto& [key, value] : headers) {
        if (SameText(key, name)) {
            return value;
        }
    }
    return "";
}

std::string PercentDecode(const std::string& text, bool plus_is_blank) {
    std::string plain;
    for (size_t i = 0; i < text.size(); i++) {
        if (text[i] == '%' && i + 2 < text.size() && isxdigit(text[i + 1]) != 0 &&
            isxdigit(text[i + 2]) != 0) {
            plain += static_cast<char>(std::stoi(text.substr(i + 1, 2), nullptr, 16));
            i += 2;
        } else {
            plain += text[i] == '+' && plus_is_blank ? ' ' : text[i];
        }
    }
    return plain;
}

Headers ParseForm(const std::string& text) {
    Headers form;
    size_t start = 0;
    while (start < text.size()) {
        const size_t end = std::min(text.find('&', start), text.size());
        const std::string pair = text.substr(start, end - start);
        const size_t equals = pair.find('=');
        if (!pair.empty()) {
            form.emplace_back(
                PercentDecode(pair.substr(0, equals), true),
                equals == std::string::npos ? "" : PercentDecode(pair.substr(equals + 1), true));
        }
        start = end + 1;
    }
    return form;
}

std::optional<uint64_t> ParseNumber(const std::string& text) {
    if (text.empty() || text.size() > 19 ||
        text.find_first_not_of("0123456789") != std::string::npos) {
        return std::nullopt;
    }
    return std::strtoull(text.c_str(), nullptr, 10);
}

std::string RandomText(size_t length) {
    static const char kLetters[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789";
    std::string text(length, '\0');
    if (RAND_bytes(reinterpret_cast<unsigned char*>(text.data()), static_cast<int>(length)) != 1) {
        abort();
    }
    for (char& c : text) {
        c = kLetters[static_cast<unsigned char>(c) % (sizeof kLetters - 1)];
    }
    return text;
}

std::string OneLine(const Json::Value& document) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, document);
}

Json::Value ParseObject(const std::string& text) {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value document;
    try {
        if (!reader->parse(text.data(), text.data() + text.size(), &document, nullptr) ||
            !document.isObject()) {
            return {};
        }
    } catch (const Json::Exception&) {
        return {};
    }
    return document;
}

}  // namespace cloudsim
