/** Any text as a URI: no crash, and what comes out keeps its promises. */
#include <glib.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "zyrovfs/server.h"
#include "zyrovfs/utils.h"

namespace {

void Check(bool promise) {
    if (!promise) {
        abort();
    }
}

bool EndsWith(const std::string& text, const std::string& end) {
    return text.size() >= end.size() &&
           text.compare(text.size() - end.size(), end.size(), end) == 0;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    using namespace ZYROVFS;
    // A complaint of the URI library about its own arguments is a fault of ours.
    g_log_set_always_fatal(static_cast<GLogLevelFlags>(G_LOG_LEVEL_CRITICAL | G_LOG_FATAL_MASK));
    const std::string text(reinterpret_cast<const char*>(data), size);
    const std::string uri = text.c_str();

    std::string base, rest, other, scheme, host;
    if (Utils::GetURIParts(uri.c_str(), base, rest)) {
        Check(EndsWith(uri, rest));
        Check(rest.size() + base.size() == uri.size() || rest.empty());
        Check(Utils::GetBaseURI(uri.c_str(), other, true) && other == base);
        Check(Utils::GetProtocol(uri.c_str(), scheme) && !scheme.empty());
    } else {
        Check(base.empty() && rest.empty());
        Check(!Utils::GetProtocol(uri.c_str(), scheme));
    }
    Utils::GetBaseURI(uri.c_str(), other, false);
    Check(Utils::GetHostWithPort(uri.c_str(), host) == Server::GetSFTPHost(uri.c_str(), other));
    Check(Utils::ConvDavProtocol(text, other));
    Check(Utils::DecodeURI(uri.c_str()).size() <= uri.size());
    return 0;
}
