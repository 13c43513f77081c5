// Answers to a request for a token, of any bytes behind a first one that picks the status: whatever
// a service says, a renewal that fails changes nothing, and one that succeeds took what was said.
#include <sys/socket.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <string>

#include "core/json.h"
#include "support/bare_driver.h"

using namespace ZYROVFS;
using namespace ZYROCloud;

namespace {

void Check(bool holds) {
    if (!holds) {
        abort();
    }
}

constexpr int kStatuses[] = {200, 200, 200, 201, 400, 401, 404};

/** The other side of the connection has said all before it is asked. */
struct Wire {
    std::string answer;
    int other_end = -1;

    void Hear() {
        if (other_end >= 0) {
            close(other_end);
            other_end = -1;
        }
    }
};

curl_socket_t Connect(void* context, curlsocktype, curl_sockaddr*) {
    Wire& wire = *static_cast<Wire*>(context);
    int ends[2];
    wire.Hear();
    Check(socketpair(AF_UNIX, SOCK_STREAM, 0, ends) == 0);
    wire.other_end = ends[1];
    Check(write(ends[1], wire.answer.data(), wire.answer.size()) ==
          static_cast<ssize_t>(wire.answer.size()));
    Check(shutdown(ends[1], SHUT_WR) == 0);
    return ends[0];
}

int IsConnected(void*, curl_socket_t, curlsocktype) {
    return CURL_SOCKOPT_ALREADY_CONNECTED;
}

class WiredDriver : public bare::TokenDriver {
  public:
    WiredDriver(const Json::Value& profile, Wire& wire) : TokenDriver(65501, profile), wire_(wire) {
        token_url = "http://127.0.0.1:9/token";
    }

    bool SetRefreshTokenParam(APIHandler* handler) override {
        CURL* const curl = handler->GetCurlHandler();
        curl_easy_setopt(curl, CURLOPT_OPENSOCKETFUNCTION, Connect);
        curl_easy_setopt(curl, CURLOPT_OPENSOCKETDATA, &wire_);
        curl_easy_setopt(curl, CURLOPT_SOCKOPTFUNCTION, IsConnected);
        curl_easy_setopt(curl, CURLOPT_PROXY, "");
        return TokenDriver::SetRefreshTokenParam(handler);
    }

  private:
    Wire& wire_;
};

Json::Value OldProfile() {
    Json::Value profile;
    profile["access_token"] = "old access";
    profile["refresh_token"] = "old refresh";
    profile["expire_time"] = "1";
    return profile;
}

void CheckTaken(const TokenInfo& token, const std::string& body) {
    Json::Value said;
    Check(json::fromString(said, body));
    Check(token.access_token == said.get("access_token", "").asString());
    Check(token.refresh_token == said.get("refresh_token", "old refresh").asString());
    Check(!token.expire_time.empty());
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size == 0) {
        return 0;
    }
    const int status = kStatuses[data[0] % std::size(kStatuses)];
    const std::string body(reinterpret_cast<const char*>(data + 1), size - 1);
    Wire wire;
    wire.answer = "HTTP/1.1 " + std::to_string(status) +
                  " Said\r\nConnection: close\r\nContent-Length: " + std::to_string(body.size()) +
                  "\r\n\r\n" + body;
    WiredDriver cloud(OldProfile(), wire);
    if (cloud.RefreshToken(true)) {
        Check(status < 400);
        CheckTaken(cloud.Token(), body);
    } else {
        Check(cloud.Token().access_token == "old access");
        Check(cloud.Token().refresh_token == "old refresh");
        Check(cloud.Token().expire_time == "1");
        Check(status < 400 || cloud.GetErrorCode() != VFS_ERR_NONE);
    }
    wire.Hear();
    return 0;
}
