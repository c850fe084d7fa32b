#include "network/HttpRequest.h"

namespace Network {

namespace {

const char kBoundaryExtension[] = "0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZ";

// Quotes and line breaks inside a quoted name are percent-encoded, as
// browsers do, so that a name cannot end the header line early.
std::string escapeQuoted(const std::string& text) {
    std::string escaped;
    for (char c : text) {
        if (c == '"') {
            escaped += "%22";
        } else if (c == '\r') {
            escaped += "%0D";
        } else if (c == '\n') {
            escaped += "%0A";
        } else {
            escaped += c;
        }
    }
    return escaped;
}

std::string withoutLineBreaks(const std::string& text) {
    std::string cleaned;
    for (char c : text) {
        if (c != '\r' && c != '\n') {
            cleaned += c;
        }
    }
    return cleaned;
}

}  // namespace

boost::shared_ptr<HttpRequest::MultipartBuilder> HttpRequest::MultipartBuilder::create(const char* boundary) {
    return boost::shared_ptr<MultipartBuilder>(new MultipartBuilder(boundary));
}

HttpRequest::MultipartBuilder::MultipartBuilder(const char* boundary)
    : boundary(boundary != nullptr ? withoutLineBreaks(boundary) : std::string()) {
    KD_ASSERT(boundary != nullptr && boundary[0] != '\0');
    if (this->boundary.empty()) {
        this->boundary = "boundary";
    }
}

void HttpRequest::MultipartBuilder::addField(const std::string& name, const std::string& value, bool binary,
                                             bool asFile, const std::string& contentType) {
    Field field;
    field.name = escapeQuoted(name);
    field.value = value;
    field.asFile = asFile;
    field.contentType = withoutLineBreaks(contentType);
    if (field.contentType.empty() && binary) {
        field.contentType = "application/octet-stream";
    }
    lengthenBoundaryToAvoid(value);
    fields.push_back(field);
}

// Values added earlier cannot contain the longer boundary either, since they
// do not contain its prefix.
void HttpRequest::MultipartBuilder::lengthenBoundaryToAvoid(const std::string& value) {
    std::size_t next = 0;
    while (value.find("--" + boundary) != std::string::npos) {
        boundary += kBoundaryExtension[next % (sizeof(kBoundaryExtension) - 1)];
        ++next;
    }
}

std::string HttpRequest::MultipartBuilder::getEncodedContent() const {
    std::string content;
    for (const Field& field : fields) {
        content += "--" + boundary + "\r\n";
        content += "Content-Disposition: form-data; name=\"" + field.name + "\"";
        if (field.asFile) {
            content += "; filename=\"" + field.name + "\"";
        }
        content += "\r\n";
        if (!field.contentType.empty()) {
            content += "Content-Type: " + field.contentType + "\r\n";
        }
        content += "\r\n";
        content += field.value;
        content += "\r\n";
    }
    content += "--" + boundary + "--\r\n";
    return content;
}

}  // namespace Network
