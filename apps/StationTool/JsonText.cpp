#include "JsonText.h"

#include <cstdio>

namespace station {

std::string JsonString(const std::string& text) {
    std::string json = "\"";
    for (unsigned char c : text) {
        switch (c) {
        case '"': json += "\\\""; break;
        case '\\': json += "\\\\"; break;
        case '\n': json += "\\n"; break;
        case '\r': json += "\\r"; break;
        case '\t': json += "\\t"; break;
        default:
            if (c < 0x20) {
                char escaped[8];
                std::snprintf(escaped, sizeof escaped, "\\u%04x", c);
                json += escaped;
            } else {
                json += static_cast<char>(c);
            }
        }
    }
    return json + "\"";
}

std::string JsonStringArray(const std::vector<std::string>& items) {
    std::string json = "[";
    for (std::size_t i = 0; i < items.size(); ++i) json += (i ? "," : "") + JsonString(items[i]);
    return json + "]";
}

std::string JsonObject(const std::vector<std::pair<std::string, std::string>>& members) {
    std::string json = "{";
    for (std::size_t i = 0; i < members.size(); ++i)
        json += (i ? "," : "") + JsonString(members[i].first) + ":" + members[i].second;
    return json + "}";
}

}  // namespace station
