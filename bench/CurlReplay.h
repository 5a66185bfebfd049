// The baseline of the end-to-end cursor benchmarks: the requests a cursor walk made, as the
// emulator logged them (same fields, signatures and session), posted again with bare libcurl
// through one keep-alive easy handle, answers read and dropped.
#pragma once

#include <curl/curl.h>

#include <string>
#include <vector>

#include "RequestLog.h"

namespace bench {

// The url-encoded form body of each logged request, in order. False when one of them was
// answered with an error (a replay of it would measure something else).
inline bool formBodies(std::vector<emu::LoggedRequest> const& requests, std::vector<std::string>& bodies) {
    CURL* easy = curl_easy_init();
    bool ok = true;
    for (emu::LoggedRequest const& r : requests) {
        if (r.errorCode != 0 || r.httpStatus != 200) ok = false;
        std::string body;
        for (auto const& [key, value] : r.args) {
            char* k = curl_easy_escape(easy, key.data(), static_cast<int>(key.size()));
            char* v = curl_easy_escape(easy, value.data(), static_cast<int>(value.size()));
            if (!body.empty()) body += '&';
            body += k;
            body += '=';
            body += v;
            curl_free(k);
            curl_free(v);
        }
        bodies.push_back(std::move(body));
    }
    curl_easy_cleanup(easy);
    return ok;
}

// Bare libcurl: one easy handle for every request, so the connection stays open.
// Not thread-safe; one per benchmark thread.
class Replayer {
public:
    explicit Replayer(std::string const& connectTo) : easy_(curl_easy_init()) {
        connectTo_ = curl_slist_append(nullptr, connectTo.c_str());
        headers_ = curl_slist_append(nullptr, "Expect:");
        curl_easy_setopt(easy_, CURLOPT_URL, "http://api.facebook.com/restserver.php");
        curl_easy_setopt(easy_, CURLOPT_CONNECT_TO, connectTo_);
        curl_easy_setopt(easy_, CURLOPT_HTTPHEADER, headers_);
        curl_easy_setopt(easy_, CURLOPT_NOSIGNAL, 1L);
        curl_easy_setopt(easy_, CURLOPT_POST, 1L);
        curl_easy_setopt(easy_, CURLOPT_WRITEFUNCTION, &appendAnswer);
        curl_easy_setopt(easy_, CURLOPT_WRITEDATA, &answer_);
    }
    ~Replayer() {
        curl_easy_cleanup(easy_);
        curl_slist_free_all(connectTo_);
        curl_slist_free_all(headers_);
    }
    Replayer(Replayer const&) = delete;
    Replayer& operator=(Replayer const&) = delete;

    // Posts `body`; false unless the answer is a 200 that is not an error document.
    bool post(std::string const& body) {
        answer_.clear();
        curl_easy_setopt(easy_, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(body.size()));
        curl_easy_setopt(easy_, CURLOPT_POSTFIELDS, body.c_str());
        if (curl_easy_perform(easy_) != CURLE_OK) return false;
        long status = 0;
        curl_easy_getinfo(easy_, CURLINFO_RESPONSE_CODE, &status);
        return status == 200 && answer_.find("<error_response") == std::string::npos;
    }

private:
    static size_t appendAnswer(char* data, size_t size, size_t count, void* answer) {
        static_cast<std::string*>(answer)->append(data, size * count);
        return size * count;
    }

    CURL* easy_;
    curl_slist* connectTo_ = nullptr;
    curl_slist* headers_ = nullptr;
    std::string answer_;
};

}  // namespace bench
