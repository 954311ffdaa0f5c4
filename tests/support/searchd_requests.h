// Requests of the search daemon's protocol, and their text.
#pragma once

#include <json/value.h>
#include <json/writer.h>  // prints values in failure messages

#include <string>

namespace test {

// Where the tests keep indexes: the directory of one is this and its language.
constexpr const char* kIndexes = "/var/packages/Velkor/etc/appindex.db/";

// Throws when the text is not JSON.
Json::Value FromText(const std::string& text);
std::string ToText(const Json::Value& value);

// What the library creates its indexes with.
Json::Value Mappings();

Json::Value Request(const std::string& command, const Json::Value& data);
Json::Value IdRequest(const std::string& command, const std::string& id);
Json::Value CreateRequest(const std::string& id, const std::string& path,
                          const Json::Value& mappings = Mappings());
Json::Value UpsertRequest(const std::string& index, const Json::Value& document);
Json::Value RemovalRequest(const std::string& index, const std::string& document_id);
Json::Value SearchRequest(const std::string& index, const std::string& query);

Json::Value Document(const std::string& id, const std::string& title, const std::string& desc = "",
                     const std::string& keywords = "", const std::string& owner = "");

// The code of a failure; 0 for a success.
int CodeOf(const Json::Value& reply);
std::string MessageOf(const Json::Value& reply);

}  // namespace test
