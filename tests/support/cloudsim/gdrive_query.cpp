#include "support/cloudsim/gdrive_query.h"

#include <algorithm>
#include <cctype>
#include <functional>
#include <map>

#include "support/cloudsim/account.h"
#include "support/cloudsim/date.h"
#include "support/cloudsim/gdrive_json.h"

namespace cloudsim::gdrive {
namespace {

[[noreturn]] void Fail() {
    throw Failure{Error(400, "invalid", "Invalid Value", "q")};
}

using Test = std::function<bool(const Node&)>;

class Condition : public Query {
  public:
    explicit Condition(Test test, std::string folder = "")
        : test_(std::move(test)), folder_(std::move(folder)) {}
    bool Fits(const Node& node) const override { return test_(node); }
    std::string OnlyIn() const override { return folder_; }

  private:
    const Test test_;
    const std::string folder_;
};

class Not : public Query {
  public:
    explicit Not(QueryPtr query) : query_(std::move(query)) {}
    bool Fits(const Node& node) const override { return !query_->Fits(node); }

  private:
    const QueryPtr query_;
};

class Both : public Query {
  public:
    Both(QueryPtr a, QueryPtr b) : a_(std::move(a)), b_(std::move(b)) {}
    bool Fits(const Node& node) const override { return a_->Fits(node) && b_->Fits(node); }
    std::string OnlyIn() const override {
        return a_->OnlyIn().empty() ? b_->OnlyIn() : a_->OnlyIn();
    }

  private:
    const QueryPtr a_, b_;
};

class Either : public Query {
  public:
    Either(QueryPtr a, QueryPtr b) : a_(std::move(a)), b_(std::move(b)) {}
    bool Fits(const Node& node) const override { return a_->Fits(node) || b_->Fits(node); }

  private:
    const QueryPtr a_, b_;
};

struct Token {
    enum class Kind { kWord, kText, kSign, kEnd };
    Kind kind = Kind::kEnd;
    std::string text;  ///< a word in lower case as well as in its own
    std::string lower;
};

/** "\'" and "\\" are all the escapes there are. */
std::string Unquote(const std::string& query, size_t& at) {
    const char quote = query[at++];
    std::string text;
    for (; at < query.size() && query[at] != quote; at++) {
        if (query[at] == '\\') {
            at++;
            if (at >= query.size() || (query[at] != quote && query[at] != '\\')) {
                Fail();
            }
        }
        text += query[at];
    }
    return at++ < query.size() ? text : (Fail(), text);
}

std::vector<Token> Split(const std::string& query) {
    static const std::string kSigns = "=<>!()";
    std::vector<Token> tokens;
    for (size_t at = 0; at < query.size();) {
        const char c = query[at];
        Token token;
        if (isspace(static_cast<unsigned char>(c)) != 0) {
            at++;
            continue;
        }
        if (c == '\'' || c == '"') {
            token = {Token::Kind::kText, Unquote(query, at), ""};
        } else if (kSigns.find(c) != std::string::npos) {
            const bool two = std::string("<>!").find(c) != std::string::npos &&
                             at + 1 < query.size() && query[at + 1] == '=';
            token = {Token::Kind::kSign, query.substr(at, two ? 2 : 1), ""};
            at += token.text.size();
        } else {
            const size_t start = at;
            while (at < query.size() && isalpha(static_cast<unsigned char>(query[at])) != 0) {
                at++;
            }
            const std::string word = at > start ? query.substr(start, at - start) : (Fail(), "");
            token = {Token::Kind::kWord, word, FoldCase(word)};
        }
        tokens.push_back(std::move(token));
    }
    return tokens;
}

/** In lower case; all that is neither letter nor digit stands between words. */
std::vector<std::string> Words(const std::string& text) {
    std::vector<std::string> words(1);
    for (const char c : FoldCase(text)) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte >= 0x80 || isalnum(byte) != 0) {
            words.back() += c;
        } else if (!words.back().empty()) {
            words.emplace_back();
        }
    }
    if (words.back().empty()) {
        words.pop_back();
    }
    return words;
}

using SameWord = bool (*)(const std::string& word, const std::string& wanted);

bool BeginsLike(const std::string& word, const std::string& start) {
    return word.compare(0, start.size(), start) == 0;
}

bool IsWord(const std::string& word, const std::string& wanted) {
    return word == wanted;
}

/** Whatever their order. */
bool HasWords(const std::string& text, const std::string& wanted, SameWord same) {
    const std::vector<std::string> words = Words(text), all = Words(wanted);
    return std::all_of(all.begin(), all.end(), [&](const std::string& one) {
        return std::any_of(words.begin(), words.end(),
                           [&](const std::string& word) { return same(word, one); });
    });
}

bool HasPhrase(const std::string& text, const std::string& phrase) {
    const std::vector<std::string> words = Words(text), wanted = Words(phrase);
    return std::search(words.begin(), words.end(), wanted.begin(), wanted.end()) != words.end() ||
           wanted.empty();
}

/** Text is found by whole words, or in double quotes by words that follow each other. */
bool HasText(const std::string& text, const std::string& wanted) {
    const bool quoted = wanted.size() > 1 && wanted.front() == '"' && wanted.back() == '"';
    return quoted ? HasPhrase(text, wanted) : HasWords(text, wanted, IsWord);
}

using Texts = std::function<std::string(const Node&)>;
const std::map<std::string, Texts> kTexts = {
    {"title", [](const Node& node) { return node.name; }},
    {"mimeType", [](const Node& node) { return MimeType(node); }},
    {"fullText", [](const Node& node) { return node.name + " " + node.description; }},
};

using Moments = std::function<Moment(const Node&)>;
const std::map<std::string, Moments> kMoments = {
    {"modifiedDate",
     [](const Node& node) {
         return Moment{node.content_modified, node.modified_millis};
     }},
    {"lastViewedByMeDate",
     [](const Node& node) {
         return Moment{node.modified, 0};
     }},
    {"createdDate",
     [](const Node& node) {
         return Moment{node.created, 0};
     }},
};

using Flags = std::function<bool(const Node&)>;
const std::map<std::string, Flags> kFlags = {
    {"trashed", [](const Node& node) { return node.IsTrashed(); }},
    {"starred", [](const Node& node) { return node.starred; }},
    {"sharedWithMe", [](const Node& node) { return node.shared != 0; }},
};

/** What two values may be to each other: the first is less, equal or greater. */
const std::map<std::string, std::function<bool(int)>> kComparisons = {
    {"=", [](int order) { return order == 0; }}, {"!=", [](int order) { return order != 0; }},
    {"<", [](int order) { return order < 0; }},  {"<=", [](int order) { return order <= 0; }},
    {">", [](int order) { return order > 0; }},  {">=", [](int order) { return order >= 0; }},
};

class Parser {
  public:
    Parser(std::vector<Token> tokens, Asker asker, std::vector<std::string>& folders)
        : tokens_(std::move(tokens)), asker_(std::move(asker)), folders_(folders) {
        tokens_.emplace_back();
    }

    QueryPtr Parse() {
        QueryPtr query = Chain();
        if (Next().kind != Token::Kind::kEnd) {
            Fail();
        }
        return query;
    }

  private:
    const Token& Next() const { return tokens_[at_]; }
    const Token& Take() { return tokens_[at_ + 1 < tokens_.size() ? at_++ : at_]; }
    bool TakeIf(Token::Kind kind, const std::string& text) {
        const bool fits = Next().kind == kind &&
                          (kind == Token::Kind::kWord ? Next().lower : Next().text) == text;
        at_ += fits ? 1 : 0;
        return fits;
    }
    std::string Text() { return Next().kind == Token::Kind::kText ? Take().text : (Fail(), ""); }

    /** Both words bind alike and are read from left to right; only brackets group. */
    QueryPtr Chain() {
        QueryPtr query = Single();
        while (true) {
            if (TakeIf(Token::Kind::kWord, "and")) {
                QueryPtr next = Single();
                query = std::make_shared<Both>(std::move(query), std::move(next));
            } else if (TakeIf(Token::Kind::kWord, "or")) {
                QueryPtr next = Single();
                query = std::make_shared<Either>(std::move(query), std::move(next));
            } else {
                return query;
            }
        }
    }

    QueryPtr Single() {
        constexpr int kDeepest = 200;
        if (depth_ > kDeepest) {
            Fail();
        }
        if (TakeIf(Token::Kind::kWord, "not")) {
            depth_++;
            QueryPtr query = Single();
            depth_--;
            return std::make_shared<Not>(std::move(query));
        }
        if (!TakeIf(Token::Kind::kSign, "(")) {
            return Next().kind == Token::Kind::kText ? Membership() : Comparison();
        }
        depth_++;
        QueryPtr query = Chain();
        depth_--;
        if (!TakeIf(Token::Kind::kSign, ")")) {
            Fail();
        }
        return query;
    }

    QueryPtr Membership() {
        const std::string member = Text();
        if (!TakeIf(Token::Kind::kWord, "in")) {
            Fail();
        }
        const std::string collection = Take().text;
        if (collection == "parents") {
            return InParents(member == "root" ? asker_.root : member);
        }
        const bool me = member == "me" || SameText(member, asker_.email);
        if (collection == "owners" || collection == "writers") {
            return std::make_shared<Condition>([me, member](const Node& node) {
                return node.sharer.empty() ? me : SameText(node.sharer, member);
            });
        }
        if (collection == "readers") {
            return std::make_shared<Condition>(
                [me, member](const Node& node) { return me || SameText(node.sharer, member); });
        }
        Fail();
    }

    QueryPtr InParents(const std::string& id) {
        folders_.push_back(id);
        return std::make_shared<Condition>(
            [id](const Node& node) {
                for (const Node* parent : node.Parents()) {
                    if (parent->id == id) {
                        return true;
                    }
                }
                return false;
            },
            id);
    }

    QueryPtr Comparison() {
        const std::string field = Next().kind == Token::Kind::kWord ? Take().text : (Fail(), "");
        const auto flag = kFlags.find(field);
        if (flag != kFlags.end()) {
            return CompareFlag(flag->second);
        }
        const auto text = kTexts.find(field);
        if (text != kTexts.end()) {
            return CompareText(field, text->second);
        }
        const auto moment = kMoments.find(field);
        return moment == kMoments.end() ? (Fail(), nullptr) : CompareDate(moment->second);
    }

    /** A flag on its own is a condition as well. */
    QueryPtr CompareFlag(const Flags& flag) {
        const bool same = TakeIf(Token::Kind::kSign, "=");
        if (!same && !TakeIf(Token::Kind::kSign, "!=")) {
            return std::make_shared<Condition>(flag);
        }
        const bool wanted = TakeIf(Token::Kind::kWord, "true");
        if (!wanted && !TakeIf(Token::Kind::kWord, "false")) {
            Fail();
        }
        return std::make_shared<Condition>(
            [flag, wanted, same](const Node& node) { return (flag(node) == wanted) == same; });
    }

    QueryPtr CompareText(const std::string& field, const Texts& value) {
        if (TakeIf(Token::Kind::kWord, "contains")) {
            return Contains(field, value, Text());
        }
        const bool same = TakeIf(Token::Kind::kSign, "=");
        if (field == "fullText" || (!same && !TakeIf(Token::Kind::kSign, "!="))) {
            Fail();
        }
        // The service finds titles without regard to case, whatever its clients would like.
        const std::string wanted = FoldCase(Text());
        return std::make_shared<Condition>([value, wanted, same](const Node& node) {
            return (FoldCase(value(node)) == wanted) == same;
        });
    }

    static QueryPtr Contains(const std::string& field, const Texts& value,
                             const std::string& wanted) {
        if (field == "mimeType") {
            return std::make_shared<Condition>([value, wanted](const Node& node) {
                return value(node).find(wanted) != std::string::npos;
            });
        }
        if (field == "fullText") {
            return std::make_shared<Condition>(
                [value, wanted](const Node& node) { return HasText(value(node), wanted); });
        }
        return std::make_shared<Condition>([value, wanted](const Node& node) {
            return HasWords(value(node), wanted, BeginsLike);
        });
    }

    QueryPtr CompareDate(const Moments& value) {
        const auto comparison = kComparisons.find(Take().text);
        if (comparison == kComparisons.end()) {
            Fail();
        }
        const auto moment = ParseDate(Text(), true);
        if (!moment) {
            Fail();
        }
        return std::make_shared<Condition>(
            [value, moment = *moment, fits = comparison->second](const Node& node) {
                const Moment own = value(node);
                return fits(own < moment ? -1 : moment < own ? 1 : 0);
            });
    }

    std::vector<Token> tokens_;
    const Asker asker_;
    std::vector<std::string>& folders_;
    size_t at_ = 0;
    int depth_ = 0;
};

}  // namespace

QueryPtr ParseQuery(const std::string& text, const Asker& asker,
                    std::vector<std::string>& folders) {
    constexpr size_t kMostTokens = 4000;
    std::vector<Token> tokens = Split(text);
    if (tokens.size() > kMostTokens) {
        Fail();
    }
    if (tokens.empty()) {
        return std::make_shared<Condition>([](const Node&) { return true; });
    }
    return Parser(std::move(tokens), asker, folders).Parse();
}

}  // namespace cloudsim::gdrive
