#include "support/cloudsim/journal.h"

#include <algorithm>
#include <chrono>
#include <stdexcept>

#include "support/cloudsim/http.h"

namespace cloudsim {
namespace {

/** JSON texts are UTF-8; what isn't is shown as hex. */
std::string Printable(const std::string& text) {
    static const char kDigits[] = "0123456789abcdef";
    std::string shown;
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte < 0x80) {
            shown += c;
        } else {
            shown += {'%', kDigits[byte >> 4], kDigits[byte & 15]};
        }
    }
    return shown;
}

Json::Value ToJson(const JournalEntry& entry) {
    Json::Value line;
    line["number"] = Json::UInt64(entry.number);
    line["connection"] = Json::UInt64(entry.connection);
    line["method"] = entry.method;
    line["target"] = Printable(entry.target);
    line["headers"] = Json::arrayValue;
    for (const auto& [name, value] : entry.headers) {
        line["headers"].append(Printable(name).append(": ").append(Printable(value)));
    }
    line["body"] = Printable(entry.body);
    line["body_size"] = Json::UInt64(entry.body_size);
    line["body_sha1"] = entry.body_sha1;
    line["account"] = entry.account;
    line["status"] = entry.status;
    line["answer_size"] = Json::UInt64(entry.answer_size);
    return line;
}

}  // namespace

std::string JournalEntry::Path() const {
    return target.substr(0, target.find('?'));
}

std::string JournalEntry::Query(const std::string& name) const {
    const size_t mark = target.find('?');
    return mark == std::string::npos ? "" : FindHeader(ParseForm(target.substr(mark + 1)), name);
}

std::string JournalEntry::Header(const std::string& name) const {
    return FindHeader(headers, name);
}

bool JournalEntry::HasHeader(const std::string& name) const {
    return std::any_of(headers.begin(), headers.end(),
                       [&](auto& header) { return SameText(header.first, name); });
}

Journal::Journal(const Options& options) : options_(options) {
    if (!options_.file.empty()) {
        file_ = fopen(options_.file.c_str(), "ae");
        if (file_ == nullptr) {
            throw std::runtime_error("cannot write the journal " + options_.file);
        }
    }
}

Journal::~Journal() {
    if (file_ != nullptr) {
        fclose(file_);
    }
}

std::vector<JournalEntry> Journal::All() const {
    const std::lock_guard<std::mutex> lock(mutex_);
    std::vector<JournalEntry> copy;
    copy.reserve(entries_.size());
    for (const auto& entry : entries_) {
        copy.push_back(*entry);
    }
    return copy;
}

std::vector<JournalEntry> Journal::Find(const std::string& method, const std::string& path) const {
    std::vector<JournalEntry> found;
    for (JournalEntry& entry : All()) {
        if ((method == "*" || entry.method == method) &&
            entry.target.compare(0, path.size(), path) == 0) {
            found.push_back(std::move(entry));
        }
    }
    return found;
}

size_t Journal::Count(const std::string& method, const std::string& path) const {
    return Find(method, path).size();
}

size_t Journal::Connections() const {
    const std::lock_guard<std::mutex> lock(mutex_);
    return connections_;
}

bool Journal::WaitFor(const std::function<bool(const std::vector<JournalEntry>&)>& reached,
                      double seconds) const {
    const auto end = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
    while (!reached(All())) {
        std::unique_lock<std::mutex> lock(mutex_);
        // A change between the look and the wait is seen a moment later.
        changed_.wait_for(lock, std::chrono::milliseconds(5));
        if (std::chrono::steady_clock::now() >= end) {
            lock.unlock();
            return reached(All());
        }
    }
    return true;
}

std::string Journal::Text() const {
    std::string text;
    for (const JournalEntry& entry : All()) {
        text += std::to_string(entry.number) + " " + entry.method + " " + entry.target + " (" +
                std::to_string(entry.body_size) + " bytes) -> " + std::to_string(entry.status) +
                "\n";
    }
    return text;
}

void Journal::Clear() {
    const std::lock_guard<std::mutex> lock(mutex_);
    entries_.clear();
}

std::shared_ptr<JournalEntry> Journal::Begin(JournalEntry entry) {
    auto made = std::make_shared<JournalEntry>(std::move(entry));
    const std::lock_guard<std::mutex> lock(mutex_);
    made->number = ++last_number_;
    if (options_.keep) {
        entries_.push_back(made);
    }
    changed_.notify_all();
    return made;
}

void Journal::Change(JournalEntry& entry, const std::function<void(JournalEntry&)>& change) {
    const std::lock_guard<std::mutex> lock(mutex_);
    change(entry);
    changed_.notify_all();
}

void Journal::Finish(JournalEntry& entry) {
    const std::lock_guard<std::mutex> lock(mutex_);
    entry.finished = true;
    changed_.notify_all();
    if (file_ != nullptr) {
        fprintf(file_, "%s\n", OneLine(ToJson(entry)).c_str());
        fflush(file_);
    }
}

uint64_t Journal::AddConnection() {
    const std::lock_guard<std::mutex> lock(mutex_);
    return ++connections_;
}

}  // namespace cloudsim
