/** A small libcurl client for tests of simulated services. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_CLIENT_H
#define ZYROVFS_TESTS_CLOUDSIM_CLIENT_H

#include <curl/curl.h>
#include <json/reader.h>
#include <json/value.h>

#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace cloudsim {

struct Got {
    CURLcode code = CURLE_OK;
    long status = 0;
    std::string head, body;

    /** Null when the body isn't JSON. */
    Json::Value Json() const {
        Json::Value document;
        const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
        const bool good = reader->parse(body.data(), body.data() + body.size(), &document, nullptr);
        return good ? document : Json::Value();
    }
};

/** Keeps its connections from one request to the next. */
class Client {
  public:
    explicit Client(std::string token = "") : token_(std::move(token)), curl_(curl_easy_init()) {}
    Client(const Client&) = delete;
    Client& operator=(const Client&) = delete;
    ~Client() { curl_easy_cleanup(curl_); }

    std::string ca;  ///< PEM text that https is checked against
    bool follow = false;
    bool fresh = false;                ///< on a kept connection libcurl itself tries again
    std::vector<std::string> headers;  ///< sent with every request
    double timeout = 20;

    void UseToken(const std::string& token) { token_ = token; }
    /** For what a test sets itself before the next request. */
    CURL* Handle() { return curl_; }

    Got Get(const std::string& url) { return Send("GET", url, nullptr); }
    Got Head(const std::string& url) {
        Prepare("HEAD", url);
        curl_easy_setopt(curl_, CURLOPT_NOBODY, 1L);
        return Perform(Got());
    }
    Got Send(const std::string& method, const std::string& url, const std::string* body) {
        Got got;
        Prepare(method, url);
        if (body != nullptr) {
            curl_easy_setopt(curl_, CURLOPT_POSTFIELDSIZE_LARGE,
                             static_cast<curl_off_t>(body->size()));
            curl_easy_setopt(curl_, CURLOPT_POSTFIELDS, body->data());
        }
        return Perform(std::move(got));
    }
    Got Send(const std::string& method, const std::string& url, const std::string& body = "") {
        return Send(method, url, body.empty() ? nullptr : &body);
    }
    /** Parts of a form, in order; a part whose name begins with '@' is a file. */
    Got Upload(const std::string& url,
               const std::vector<std::pair<std::string, std::string>>& parts) {
        Got got;
        Prepare("POST", url);
        curl_mime* form = curl_mime_init(curl_);
        for (const auto& [name, data] : parts) {
            curl_mimepart* part = curl_mime_addpart(form);
            const bool file = name[0] == '@';
            curl_mime_name(part, name.c_str() + (file ? 1 : 0));
            curl_mime_data(part, data.data(), data.size());
            curl_mime_filename(part, file ? "upload.bin" : nullptr);
        }
        curl_easy_setopt(curl_, CURLOPT_MIMEPOST, form);
        got = Perform(std::move(got));
        curl_mime_free(form);
        return got;
    }

  private:
    static size_t Append(char* data, size_t, size_t size, void* to) {
        static_cast<std::string*>(to)->append(data, size);
        return size;
    }

    void Prepare(const std::string& method, const std::string& url) {
        curl_easy_reset(curl_);
        curl_easy_setopt(curl_, CURLOPT_URL, url.c_str());
        curl_easy_setopt(curl_, CURLOPT_CUSTOMREQUEST, method.c_str());
        curl_easy_setopt(curl_, CURLOPT_NOSIGNAL, 1L);
        curl_easy_setopt(curl_, CURLOPT_TIMEOUT_MS, static_cast<long>(timeout * 1000));
        curl_easy_setopt(curl_, CURLOPT_FOLLOWLOCATION, follow ? 1L : 0L);
        curl_easy_setopt(curl_, CURLOPT_FRESH_CONNECT, fresh ? 1L : 0L);
        if (!ca.empty()) {
            curl_blob blob = {const_cast<char*>(ca.data()), ca.size(), CURL_BLOB_COPY};
            curl_easy_setopt(curl_, CURLOPT_CAINFO_BLOB, &blob);
        }
    }

    Got Perform(Got got) {
        curl_slist* lines = nullptr;
        if (!token_.empty()) {
            lines = curl_slist_append(lines, ("Authorization: Bearer " + token_).c_str());
        }
        for (const std::string& header : headers) {
            lines = curl_slist_append(lines, header.c_str());
        }
        curl_easy_setopt(curl_, CURLOPT_HTTPHEADER, lines);
        curl_easy_setopt(curl_, CURLOPT_WRITEFUNCTION, Append);
        curl_easy_setopt(curl_, CURLOPT_WRITEDATA, &got.body);
        curl_easy_setopt(curl_, CURLOPT_HEADERFUNCTION, Append);
        curl_easy_setopt(curl_, CURLOPT_HEADERDATA, &got.head);
        got.code = curl_easy_perform(curl_);
        curl_easy_getinfo(curl_, CURLINFO_RESPONSE_CODE, &got.status);
        curl_slist_free_all(lines);
        return got;
    }

    std::string token_;
    CURL* curl_;
};

}  // namespace cloudsim

#endif
