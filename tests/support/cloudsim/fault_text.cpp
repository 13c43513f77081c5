/** Faults in the form of the command line. */
#include <functional>
#include <map>
#include <sstream>
#include <stdexcept>

#include "support/cloudsim/fault.h"

namespace cloudsim {
namespace {

[[noreturn]] void Refuse(const std::string& word) {
    throw std::invalid_argument("fault: cannot read \"" + word + "\"");
}

const std::map<std::string, Break> kBreaks = {
    {"before", Break::kBeforeBody}, {"after", Break::kAfterBody}, {"effect", Break::kAfterEffect}};
const std::map<std::string, RangeFault> kRanges = {{"ignore", RangeFault::kIgnore},
                                                   {"start", RangeFault::kWrongStart},
                                                   {"short", RangeFault::kShort}};
const std::map<char, char> kEscapes = {{'r', '\r'}, {'n', '\n'}, {'s', ' '}, {'\\', '\\'}};

template <typename Value>
Value Choice(const std::map<std::string, Value>& choices, const std::string& text) {
    const auto found = choices.find(text);
    return found != choices.end() ? found->second : (Refuse(text), Value());
}

template <typename Value>
std::string NameOf(const std::map<std::string, Value>& choices, Value value) {
    for (const auto& [name, choice] : choices) {
        if (choice == value) {
            return name;
        }
    }
    return "";
}

uint64_t Number(const std::string& text) {
    size_t end = 0;
    unsigned long long number = 0;
    try {
        number = std::stoull(text, &end);
    } catch (const std::logic_error&) {
        Refuse(text);
    }
    return end == text.size() && text[0] != '-' ? number : (Refuse(text), 0);
}

int Count(const std::string& text) {
    return text == "forever" ? Fault::kForever : static_cast<int>(Number(text));
}

std::string Unescape(const std::string& text) {
    std::string plain;
    for (size_t i = 0; i < text.size(); i++) {
        if (text[i] != '\\') {
            plain += text[i];
            continue;
        }
        const char kind = ++i < text.size() ? text[i] : '\0';
        const auto escape = kEscapes.find(kind);
        if (escape != kEscapes.end()) {
            plain += escape->second;
        } else if (kind == 'x' && i + 2 < text.size()) {
            plain += static_cast<char>(std::stoi(text.substr(i + 1, 2), nullptr, 16));
            i += 2;
        } else {
            Refuse(text);
        }
    }
    return plain;
}

std::string Escape(const std::string& plain) {
    static const char kDigits[] = "0123456789abcdef";
    std::string text;
    for (const char c : plain) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte > ' ' && byte < 0x7f && c != '\\') {
            text += c;
        } else {
            text += {'\\', 'x', kDigits[byte >> 4], kDigits[byte & 15]};
        }
    }
    return text;
}

std::string Before(const std::string& pair) {
    return pair.substr(0, pair.find(':'));
}

std::string Behind(const std::string& pair) {
    const size_t colon = pair.find(':');
    return colon == std::string::npos ? "" : pair.substr(colon + 1);
}

using Setter = std::function<void(Fault&, const std::string&)>;

const std::map<std::string, Setter>& Setters() {
    static const std::map<std::string, Setter> setters = {
        {"host", [](Fault& f, const std::string& v) { f.AtHost(v); }},
        {"after", [](Fault& f, const std::string& v) { f.After(Count(v)); }},
        {"times", [](Fault& f, const std::string& v) { f.Times(Count(v)); }},
        {"answer",
         [](Fault& f, const std::string& v) {
             f.status = Count(v);
             f.without_effect = true;
             f.body = f.body.value_or("");
         }},
        {"status", [](Fault& f, const std::string& v) { f.Status(Count(v)); }},
        {"body", [](Fault& f, const std::string& v) { f.Body(Unescape(v)); }},
        {"header",
         [](Fault& f, const std::string& v) {
             f.Header(Unescape(Before(v)), Unescape(Behind(v)));
         }},
        {"line", [](Fault& f, const std::string& v) { f.HeaderLine(Unescape(v)); }},
        {"raw", [](Fault& f, const std::string& v) { f.Raw(Unescape(v)); }},
        {"delay", [](Fault& f, const std::string& v) { f.Delay(std::stod(v)); }},
        {"rate", [](Fault& f, const std::string& v) { f.Throttle(Number(v)); }},
        {"upload-rate", [](Fault& f, const std::string& v) { f.ThrottleUpload(Number(v)); }},
        {"pause",
         [](Fault& f, const std::string& v) { f.Pause(Number(Before(v)), std::stod(Behind(v))); }},
        {"pause-upload",
         [](Fault& f, const std::string& v) {
             f.PauseUpload(Number(Before(v)), std::stod(Behind(v)));
         }},
        {"cut", [](Fault& f, const std::string& v) { f.CutAnswer(Number(v)); }},
        {"cut-upload", [](Fault& f, const std::string& v) { f.CutUpload(Number(v)); }},
        {"short-upload", [](Fault& f, const std::string& v) { f.ShortUpload(Number(v)); }},
        {"close", [](Fault& f, const std::string& v) { f.Close(Choice(kBreaks, v)); }},
        {"range", [](Fault& f, const std::string& v) { f.Range(Choice(kRanges, v)); }},
        {"reset", [](Fault& f, const std::string&) { f.Reset(); }},
        {"close-after-answer", [](Fault& f, const std::string&) { f.CloseAfterAnswer(); }},
        {"expire-token", [](Fault& f, const std::string&) { f.ExpireToken(); }},
    };
    return setters;
}

void AddNumber(std::ostream& text, const char* word, uint64_t number) {
    if (number != 0) {
        text << ' ' << word << '=' << number;
    }
}

void AddAnswer(std::ostream& text, const Fault& fault) {
    AddNumber(text, fault.without_effect && !fault.raw ? "answer" : "status",
              static_cast<uint64_t>(fault.status));
    if (fault.body && !fault.body->empty()) {
        text << " body=" << Escape(*fault.body);
    }
    for (const auto& [name, value] : fault.headers) {
        text << " header=" << Escape(name) << ':' << Escape(value);
    }
    for (const std::string& line : fault.header_lines) {
        text << " line=" << Escape(line);
    }
    if (fault.raw) {
        text << " raw=" << Escape(*fault.raw);
    }
}

void AddBreaks(std::ostream& text, const Fault& fault) {
    if (fault.pause_answer) {
        text << " pause=" << *fault.pause_answer << ':' << fault.pause;
    }
    if (fault.pause_upload) {
        text << " pause-upload=" << *fault.pause_upload << ':' << fault.pause;
    }
    if (fault.cut_answer) {
        text << " cut=" << *fault.cut_answer;
    }
    if (fault.cut_upload) {
        text << " cut-upload=" << *fault.cut_upload;
    }
    if (fault.short_upload) {
        text << " short-upload=" << *fault.short_upload;
    }
    if (fault.close != Break::kNone) {
        text << " close=" << NameOf(kBreaks, fault.close);
    }
    if (fault.range != RangeFault::kNone) {
        text << " range=" << NameOf(kRanges, fault.range);
    }
    text << (fault.reset ? " reset" : "") << (fault.close_after_answer ? " close-after-answer" : "")
         << (fault.expire_token ? " expire-token" : "");
}

}  // namespace

std::string Fault::Text() const {
    std::ostringstream text;
    text << method << ' ' << path << (host.empty() ? "" : " host=" + host);
    AddNumber(text, "after", static_cast<uint64_t>(after));
    if (times != 1) {
        text << " times=" << (times == kForever ? "forever" : std::to_string(times));
    }
    AddAnswer(text, *this);
    if (delay > 0) {
        text << " delay=" << delay;
    }
    AddNumber(text, "rate", answer_rate);
    AddNumber(text, "upload-rate", upload_rate);
    AddBreaks(text, *this);
    return text.str();
}

Fault ParseFault(const std::string& text) {
    std::istringstream words(text);
    std::string method, path, word;
    if (!(words >> method >> path)) {
        Refuse(text);
    }
    Fault fault = Fault::On(method, path);
    while (words >> word) {
        const size_t equals = word.find('=');
        const auto setter = Setters().find(word.substr(0, equals));
        if (setter == Setters().end()) {
            Refuse(word);
        }
        try {
            setter->second(fault, equals == std::string::npos ? "" : word.substr(equals + 1));
        } catch (const std::logic_error&) {
            Refuse(word);
        }
    }
    return fault;
}

}  // namespace cloudsim
