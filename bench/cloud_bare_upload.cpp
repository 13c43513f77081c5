#include "cloud_bare_upload.h"

#include <curl/curl.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>

namespace bench {
namespace {

constexpr long long kPiece = 33554432;  // 32 MiB, as the drivers cut
constexpr const char* kJson = "Content-Type: application/json";
constexpr const char* kBytes = "Content-Type: application/octet-stream";
constexpr const char* kBits = "BITS_POST";

/** One handle, reused for all requests of an upload. */
class Wire {
  public:
    Wire(const Access& to, std::string file, int descriptor, long long total)
        : access(to), name(std::move(file)), size(total), fd_(descriptor) {}
    Wire(const Wire&) = delete;
    Wire& operator=(const Wire&) = delete;
    ~Wire() { curl_easy_cleanup(curl_); }

    /** A request with a text as its body. */
    bool Say(const char* method, const std::string& url, const std::vector<std::string>& headers,
             const std::string& text = "") {
        Begin(url);
        curl_easy_setopt(curl_, CURLOPT_POSTFIELDSIZE, static_cast<long>(text.size()));
        curl_easy_setopt(curl_, CURLOPT_COPYPOSTFIELDS, text.c_str());
        return Perform(method, headers);
    }

    /** A request with the next bytes of the file as its body. */
    bool Send(const char* method, const std::string& url, const std::vector<std::string>& headers,
              long long length) {
        Begin(url);
        left_ = length;
        curl_easy_setopt(curl_, CURLOPT_UPLOAD, 1L);
        curl_easy_setopt(curl_, CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(length));
        curl_easy_setopt(curl_, CURLOPT_READFUNCTION, Read);
        curl_easy_setopt(curl_, CURLOPT_READDATA, this);
        return Perform(method, headers) && left_ == 0;
    }

    std::string Header(const char* wanted) const {
        curl_header* header = nullptr;
        return curl_easy_header(curl_, wanted, 0, CURLH_HEADER, -1, &header) == CURLHE_OK
                   ? header->value
                   : "";
    }

    const Access& access;
    const std::string name;
    const long long size;
    std::string session, answer;

  private:
    static size_t Append(char* data, size_t one, size_t count, std::string* out) {
        out->append(data, one * count);
        return one * count;
    }
    static size_t Read(char* to, size_t one, size_t count, Wire* wire) {
        const auto room = static_cast<long long>(one) * static_cast<long long>(count);
        const ssize_t n = read(wire->fd_, to, static_cast<size_t>(std::min(room, wire->left_)));
        wire->left_ -= std::max<ssize_t>(n, 0);
        return n < 0 ? CURL_READFUNC_ABORT : static_cast<size_t>(n);
    }

    void Begin(const std::string& url) {
        curl_easy_reset(curl_);
        answer.clear();
        curl_easy_setopt(curl_, CURLOPT_URL, url.c_str());
        curl_easy_setopt(curl_, CURLOPT_WRITEFUNCTION, Append);
        curl_easy_setopt(curl_, CURLOPT_WRITEDATA, &answer);
    }

    bool Perform(const char* method, const std::vector<std::string>& headers) {
        curl_slist* list =
            curl_slist_append(nullptr, ("Authorization: Bearer " + access.token).c_str());
        for (const std::string& header : headers) {
            list = curl_slist_append(list, header.c_str());
        }
        curl_easy_setopt(curl_, CURLOPT_CUSTOMREQUEST, method);
        curl_easy_setopt(curl_, CURLOPT_HTTPHEADER, list);
        const CURLcode code = curl_easy_perform(curl_);
        curl_slist_free_all(list);
        long status = 0;
        curl_easy_getinfo(curl_, CURLINFO_RESPONSE_CODE, &status);
        return code == CURLE_OK && status / 100 == 2;
    }

    CURL* curl_ = curl_easy_init();
    const int fd_;
    long long left_ = 0;
};

// --- Dropbox: sessions -------------------------------------------------------------------------

std::string DropboxUrl(const Wire& wire, const char* what) {
    return wire.access.hosts.at("content") + "/2/files/upload_session/" + what;
}

std::string DropboxCursor(const Wire& wire, long long offset) {
    return "Dropbox-API-Arg: {\"cursor\":{\"session_id\":\"" + wire.session +
           "\",\"offset\":" + std::to_string(offset) + "}";
}

bool BeginDropbox(Wire& wire) {
    constexpr const char* kMember = "\"session_id\"";
    if (!wire.Say("POST", DropboxUrl(wire, "start"), {kBytes, "Dropbox-API-Arg: {}"})) {
        return false;
    }
    const size_t member = wire.answer.find(kMember);
    if (member == std::string::npos) {
        return false;
    }
    const size_t from = wire.answer.find('"', member + strlen(kMember)) + 1;
    wire.session = wire.answer.substr(from, wire.answer.find('"', from) - from);
    return true;
}

bool SendDropbox(Wire& wire, long long offset, long long length) {
    return wire.Send("POST", DropboxUrl(wire, "append_v2"),
                     {kBytes, DropboxCursor(wire, offset) + "}"}, length);
}

bool EndDropbox(Wire& wire) {
    return wire.Say("POST", DropboxUrl(wire, "finish"),
                    {kBytes, DropboxCursor(wire, wire.size) + ",\"commit\":{\"path\":\"/" +
                                 wire.name + "\"}}"});
}

// --- Google Drive: the resumable protocol, in one request ---------------------------------------

bool BeginGoogle(Wire& wire) {
    const bool begun = wire.Say(
        "POST", wire.access.hosts.at("api") + "/upload/drive/v2/files?uploadType=resumable",
        {kJson}, "{\"title\":\"" + wire.name + "\"}");
    wire.session = wire.Header("Location");
    return begun && !wire.session.empty();
}

bool SendGoogle(Wire& wire, long long /*offset*/, long long length) {
    return wire.Send("PUT", wire.session, {kBytes}, length);
}

// --- OneDrive: BITS -----------------------------------------------------------------------------

std::string StorageUrl(const Wire& wire) {
    const std::string& id = wire.access.account;
    return "http://cid-" + id + wire.access.hosts.at("storage") + "/users/0x" + id +
           "/LiveFolders/" + wire.name;
}

bool BeginBits(Wire& wire) {
    const bool begun =
        wire.Say(kBits, StorageUrl(wire),
                 {"BITS-Packet-Type: Create-Session",
                  "BITS-Supported-Protocols: {7df0354d-249b-430f-820d-3d2a9bef4931}"});
    wire.session = "BITS-Session-Id: " + wire.Header("BITS-Session-Id");
    return begun;
}

bool SendBits(Wire& wire, long long offset, long long length) {
    return wire.Send(kBits, StorageUrl(wire),
                     {"BITS-Packet-Type: Fragment", wire.session,
                      "Content-Range: bytes " + std::to_string(offset) + "-" +
                          std::to_string(offset + length - 1) + "/" + std::to_string(wire.size)},
                     length);
}

bool EndBits(Wire& wire) {
    return wire.Say(kBits, StorageUrl(wire), {"BITS-Packet-Type: Close-Session", wire.session});
}

bool Nothing(Wire& /*wire*/) {
    return true;
}

constexpr struct Protocol {
    const char* service;
    long long piece;  ///< 0: all at once
    bool (*begin)(Wire& wire);
    bool (*send)(Wire& wire, long long offset, long long length);
    bool (*end)(Wire& wire);
} kProtocols[] = {
    {"dropbox", kPiece, BeginDropbox, SendDropbox, EndDropbox},
    {"google", 0, BeginGoogle, SendGoogle, Nothing},
    {"onedrive", kPiece, BeginBits, SendBits, EndBits},
};

const Protocol* Find(const Service& service) {
    for (const Protocol& protocol : kProtocols) {
        if (strcmp(protocol.service, service.name) == 0) {
            return &protocol;
        }
    }
    return nullptr;
}

}  // namespace

bool HasBareUpload(const Service& service) {
    return Find(service) != nullptr;
}

bool UploadBare(const Service& service, const Access& access, const std::string& name, int fd,
                long long size) {
    const Protocol& protocol = *Find(service);
    Wire wire(access, name, fd, size);
    const long long piece = protocol.piece == 0 ? size : protocol.piece;
    if (!protocol.begin(wire)) {
        return false;
    }
    for (long long offset = 0; offset < size; offset += piece) {
        if (!protocol.send(wire, offset, std::min(piece, size - offset))) {
            return false;
        }
    }
    return protocol.end(wire);
}

}  // namespace bench
