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

CURLcode AddTexts(curl_mime* form, const Json::Value& params) {
    for (const std::string& name : params.getMemberNames()) {
        const CURLcode code = AddText(form, name, params[name]);
        if (code != CURLE_OK) {
            return code;
        }
    }
    return CURLE_OK;
}

}  // namespace

size_t APIHandler::ReadFormFile(char* data, size_t size, size_t count, void* file) {
    const XferData& source = *static_cast<FormFile*>(file)->source;
    return source.callback(data, size, count, source.context);
}

int APIHandler::SeekFormFile(void* file, curl_off_t offset, int origin) {
    const FormFile& self = *static_cast<FormFile*>(file);
    return self.seek(self.seek_data, offset, origin);
}

CURLcode APIHandler::AddFormFile(curl_mime* form) {
    if (form_data_->name.empty()) {
        return CURLE_OK;
    }
    curl_mimepart* part = curl_mime_addpart(form);
    if (part == nullptr) {
        return CURLE_OUT_OF_MEMORY;
    }
    if (form_data_->xfer == nullptr || form_data_->xfer->callback == nullptr) {
        return CURLE_BAD_FUNCTION_ARGUMENT;
    }
    form_file_ = {form_data_->xfer, seek_function_, seek_data_};
    return First({curl_mime_name(part, form_data_->name.c_str()), curl_mime_filename(part, "file"),
                  curl_mime_data_cb(part, static_cast<curl_off_t>(form_data_->size), ReadFormFile,
                                    seek_function_ == nullptr ? nullptr : SeekFormFile, nullptr,
                                    &form_file_)});
}

bool APIHandler::SetForm(curl_mime** form) {
    if (form_data_ == nullptr) {
        return true;
    }
    *form = curl_mime_init(curl_);
    CURLcode code = *form == nullptr ? CURLE_OUT_OF_MEMORY : AddTexts(*form, form_data_->params);
    if (code == CURLE_OK) {
        code = AddFormFile(*form);
    }
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
