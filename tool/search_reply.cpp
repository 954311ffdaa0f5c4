#include "tool/search_reply.h"

#include <string>
#include <vector>

#include "tool/daemon.h"

namespace tool {
namespace {

struct Type {
  const char* name;
  bool (*has)(const Json::Value& value);
};

constexpr Type kText = {"a text", [](const Json::Value& value) { return value.isString(); }};
constexpr Type kNumber = {"a number", [](const Json::Value& value) { return value.isNumeric(); }};
constexpr Type kCount = {"a count", [](const Json::Value& value) { return value.isUInt64(); }};
constexpr Type kTruth = {"true or false", [](const Json::Value& value) { return value.isBool(); }};
constexpr Type kList = {"a list", [](const Json::Value& value) { return value.isArray(); }};
constexpr Type kObject = {"an object", [](const Json::Value& value) { return value.isObject(); }};

struct Member {
  const char* name;
  Type type;
  bool is_required;
};

using Members = std::vector<Member>;

void Require(const Json::Value& value, const std::string& name, const Type& type) {
  if (!type.has(value)) FailOfNonsense(name + " is not " + type.name);
}

void RequireMembers(const Json::Value& value, const std::string& name, const Members& members) {
  Require(value, name, kObject);
  for (const Member& member : members) {
    if (!member.is_required && !value.isMember(member.name)) continue;
    Require(value[member.name], "\"" + std::string(member.name) + "\"", member.type);
  }
}

}  // namespace

void RequireSearchReply(const Json::Value& reply) {
  RequireMembers(reply, "it",
                 {{"total", kCount, true},
                  {"hits", kList, true},
                  {"matched", kText, false},
                  {"cut", kTruth, false}});
  for (const Json::Value& hit : reply["hits"]) {
    RequireMembers(hit, "one of \"hits\"",
                   {{"id", kText, true},
                    {"title", kText, false},
                    {"desc", kText, false},
                    {"score", kNumber, true},
                    {"explain", kList, false}});
    for (const Json::Value& part : hit["explain"]) {
      RequireMembers(part, "one of \"explain\"",
                     {{"text", kText, true},
                      {"member", kText, true},
                      {"found", kText, true},
                      {"worth", kNumber, true}});
    }
  }
}

}  // namespace tool
