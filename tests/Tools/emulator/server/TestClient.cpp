#include "TestClient.h"

#include <openssl/evp.h>

#include <cstdio>
#include <regex>
#include <stdexcept>

namespace emu::test {
namespace {

std::size_t collect(char* data, std::size_t size, std::size_t count, void* out) {
    static_cast<std::string*>(out)->append(data, size * count);
    return size * count;
}

std::string md5Hex(std::string const& text) {
    unsigned char digest[EVP_MAX_MD_SIZE];
    unsigned int length = 0;
    EVP_Digest(text.data(), text.size(), digest, &length, EVP_md5(), nullptr);
    std::string out;
    char two[3];
    for (unsigned int i = 0; i < length; ++i) {
        std::snprintf(two, sizeof two, "%02x", digest[i]);
        out += two;
    }
    return out;
}

}  // namespace

int Reply::errorCode() const {
    static const std::regex code("<error_response[^>]*>\\s*<error_code>(\\d+)</error_code>");
    std::smatch m;
    return std::regex_search(body, m, code) ? std::stoi(m[1]) : 0;
}

TestClient::TestClient() : curl_(curl_easy_init()) {
    if (curl_ == nullptr) throw std::runtime_error("curl_easy_init failed");
}

TestClient::~TestClient() { curl_easy_cleanup(curl_); }

std::string TestClient::encode(Fields const& fields) {
    std::string out;
    for (auto const& [key, value] : fields) {
        char* k = curl_easy_escape(curl_, key.data(), static_cast<int>(key.size()));
        char* v = curl_easy_escape(curl_, value.data(), static_cast<int>(value.size()));
        if (!out.empty()) out += '&';
        out += k;
        out += '=';
        out += v;
        curl_free(k);
        curl_free(v);
    }
    return out;
}

Reply TestClient::perform(std::string const& url) {
    Reply reply;
    curl_slist* connectTo = nullptr;
    if (!connectTo_.empty()) connectTo = curl_slist_append(nullptr, connectTo_.c_str());
    curl_easy_setopt(curl_, CURLOPT_URL, url.c_str());
    curl_easy_setopt(curl_, CURLOPT_CONNECT_TO, connectTo);
    curl_easy_setopt(curl_, CURLOPT_CAINFO, caFile_.empty() ? nullptr : caFile_.c_str());
    curl_easy_setopt(curl_, CURLOPT_WRITEFUNCTION, &collect);
    curl_easy_setopt(curl_, CURLOPT_WRITEDATA, &reply.body);
    curl_easy_setopt(curl_, CURLOPT_TIMEOUT, 30L);
    curl_easy_setopt(curl_, CURLOPT_NOSIGNAL, 1L);
    reply.code = curl_easy_perform(curl_);
    curl_easy_getinfo(curl_, CURLINFO_RESPONSE_CODE, &reply.status);
    curl_easy_getinfo(curl_, CURLINFO_NUM_CONNECTS, &reply.newConnections);
    char* type = nullptr;
    if (curl_easy_getinfo(curl_, CURLINFO_CONTENT_TYPE, &type) == CURLE_OK && type != nullptr) reply.contentType = type;
    curl_easy_setopt(curl_, CURLOPT_CONNECT_TO, nullptr);
    curl_slist_free_all(connectTo);
    return reply;
}

Reply TestClient::postForm(std::string const& url, Fields const& fields) { return postRaw(url, "", encode(fields)); }

Reply TestClient::postRaw(std::string const& url, std::string const& contentType, std::string const& body) {
    curl_slist* headers =
        contentType.empty() ? nullptr : curl_slist_append(nullptr, ("Content-Type: " + contentType).c_str());
    curl_easy_setopt(curl_, CURLOPT_HTTPHEADER, headers);
    curl_easy_setopt(curl_, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(body.size()));
    curl_easy_setopt(curl_, CURLOPT_COPYPOSTFIELDS, body.data());
    Reply reply = perform(url);
    curl_easy_setopt(curl_, CURLOPT_HTTPHEADER, nullptr);
    curl_slist_free_all(headers);
    return reply;
}

Reply TestClient::postMultipart(std::string const& url, Fields const& fields, std::vector<FilePart> const& files) {
    return postRaw(url, std::string("multipart/form-data; boundary=") + kBoundary, multipart(fields, files));
}

Reply TestClient::get(std::string const& url, Fields const& fields) {
    curl_easy_setopt(curl_, CURLOPT_HTTPGET, 1L);
    return perform(url + "?" + encode(fields));
}

std::string multipart(Fields const& fields, std::vector<FilePart> const& files) {
    const std::string delimiter = std::string("--") + kBoundary;
    std::string body;
    for (auto const& [key, value] : fields)
        body += delimiter + "\r\nContent-Disposition: form-data; name=\"" + key + "\"\r\n\r\n" + value + "\r\n";
    for (FilePart const& p : files)
        body += delimiter + "\r\nContent-Disposition: form-data; " + p.disposition +
                "\r\nContent-Type: application/octet-stream\r\n\r\n" + p.content + "\r\n";
    return body + delimiter + "--\r\n";
}

Fields sign(Fields fields, std::string const& secret) {
    std::string text;
    for (auto const& [key, value] : fields)
        if (key != "sig") text += key + "=" + value;
    fields["sig"] = md5Hex(text + secret);
    return fields;
}

}  // namespace emu::test
