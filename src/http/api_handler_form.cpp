#include "core/log.h"
#include "http/api_handler.h"

namespace ZYROCloud {

namespace {

// libcurl's older form interface puts the same bytes on the wire, but it cannot read a file again
// when a kept connection dies under it, and does not say that an empty file is empty.

CURLcode First(std::initializer_list<CURLcode> codes) {
    for (const CURLcode code : codes) {
        if (code != CURLE_OK) {
            return code;
        }
    }
    return CURLE_OK;
}

CURLcode AddText(curl_mime* form, const std::string& name, const Json::Value& value) {
    curl_mimepart* part = curl_mime_addpart(form);
    if (part == nullptr) {
        return CURLE_OUT_OF_MEMORY;
    }
    return First({curl_mime_name(part, name.c_str()),
                  curl_mime_data(part, value.asCString(), CURL_ZERO_TERMINATED),
                  curl_mime_type(part, "application/json; charset=UTF-8")});
}

CURLcode AddFile(curl_mime* form, const FormUploadData& data, SeekCallback seek) {
    curl_mimepart* part = curl_mime_addpart(form);
    if (part == nullptr) {
        return CURLE_OUT_OF_MEMORY;
    }
    if (data.xfer == nullptr || data.xfer->callback == nullptr) {
        return CURLE_BAD_FUNCTION_ARGUMENT;
    }
    return First({curl_mime_name(part, data.name.c_str()), curl_mime_filename(part, "file"),
                  curl_mime_data_cb(part, static_cast<curl_off_t>(data.size), data.xfer->callback,
                                    seek, nullptr, data.xfer->context)});
}

CURLcode Fill(curl_mime* form, const FormUploadData& data, SeekCallback seek) {
    for (const std::string& name : data.params.getMemberNames()) {
        const CURLcode code = AddText(form, name, data.params[name]);
        if (code != CURLE_OK) {
            return code;
        }
    }
    return data.name.empty() ? CURLE_OK : AddFile(form, data, seek);
}

}  // namespace

bool APIHandler::SetForm(curl_mime** form) {
    if (form_data_ == nullptr) {
        return true;
    }
    *form = curl_mime_init(curl_);
    CURLcode code =
        *form == nullptr ? CURLE_OUT_OF_MEMORY : Fill(*form, *form_data_, seek_function_);
    if (code == CURLE_OK && form_data_->xfer != nullptr) {
        code = curl_easy_setopt(curl_, CURLOPT_READFUNCTION, form_data_->xfer->callback);
    }
    if (code == CURLE_OK) {
        code = curl_easy_setopt(curl_, CURLOPT_MIMEPOST, *form);
    }
    if (code != CURLE_OK) {
        LOG_ERROR("Failed to add form upload, code=%d", static_cast<int>(code));
    }
    return code == CURLE_OK;
}

}  // namespace ZYROCloud
