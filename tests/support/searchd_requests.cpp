#include "tests/support/searchd_requests.h"

#include <json/reader.h>

#include <sstream>

namespace test {

Json::Value FromText(const std::string& text) {
  Json::Value value;
  std::istringstream(text) >> value;
  return value;
}

std::string ToText(const Json::Value& value) {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  return Json::writeString(builder, value);
}

Json::Value Mappings() {
  return FromText(R"({
    "property_id": "id",
    "default": {"type": "string", "analyzer": "tovostandard", "required": false, "stored": true,
                "_all": true},
    "properties": {
      "id": {"analyzer": "keyword", "required": true, "_all": false},
      "owner": {"analyzer": "keyword", "_all": false},
      "title": {"type": "text"}, "desc": {"type": "text"}, "keywords": {"type": "text"},
      "search_title": {"type": "text", "analyzer": "white space",
                       "preprocess": ["tolower", "ngram"]}}})");
}

Json::Value Request(const std::string& command, const Json::Value& data) {
  Json::Value request(Json::objectValue);
  request["command"] = command;
  request["data"] = data;
  return request;
}

Json::Value IdRequest(const std::string& command, const std::string& id) {
  Json::Value data(Json::objectValue);
  data["id"] = id;
  return Request(command, data);
}

Json::Value CreateRequest(const std::string& id, const std::string& path,
                          const Json::Value& mappings) {
  Json::Value request = IdRequest("index_create", id);
  request["data"]["path"] = path;
  request["data"]["settings"] = Json::Value(Json::objectValue);
  request["data"]["mappings"] = mappings;
  return request;
}

Json::Value UpsertRequest(const std::string& index, const Json::Value& document) {
  Json::Value request = IdRequest("document_upsert_by_id", index);
  request["data"]["doc_id"] = document["id"];
  request["data"]["data"] = document;
  return request;
}

Json::Value RemovalRequest(const std::string& index, const std::string& document_id) {
  Json::Value request = IdRequest("document_del_by_id", index);
  request["data"]["doc_id"] = document_id;
  return request;
}

Json::Value SearchRequest(const std::string& index, const std::string& query) {
  Json::Value request = IdRequest("search", index);
  request["data"]["query"] = query;
  return request;
}

Json::Value Document(const std::string& id, const std::string& title, const std::string& desc,
                     const std::string& keywords, const std::string& owner) {
  Json::Value document(Json::objectValue);
  document["id"] = id;
  document["owner"] = owner;
  document["title"] = title;
  document["desc"] = desc;
  document["keywords"] = keywords;
  document["search_title"] = title;
  return document;
}

int CodeOf(const Json::Value& reply) {
  return reply["success"].asBool() ? 0 : reply["error"]["code"].asInt();
}

std::string MessageOf(const Json::Value& reply) { return reply["error"]["msg"].asString(); }

}  // namespace test
