// The commands: from the text of a request to the text of its reply.
#pragma once

#include <json/value.h>

#include <string>

#include "host/searchd/catalog.h"
#include "host/searchd/handler.h"

namespace searchd {

class Dispatcher : public Handler {
 public:
  explicit Dispatcher(Catalog& catalog) : catalog_(catalog) {}

  bool IsQuick(const std::string& request) override;
  Answer Handle(const std::string& request, uid_t client) override;
  std::string TooLong() override;
  bool HasIdleWork() override;
  void DoIdleWork() override;

 private:
  struct Request {
    Json::Value data;
    std::size_t bytes = 0;
    std::function<void()> after;
  };
  struct Command {
    bool changes;
    Json::Value (Dispatcher::*run)(Request&);
  };

  static const Command& FindCommand(const std::string& name);
  Json::Value Run(const std::string& text, uid_t client, std::function<void()>& after);
  void ApplyAfterReply(Request& request, const std::shared_ptr<Index>& index);

  Json::Value Create(Request& request);
  Json::Value Delete(Request& request);
  Json::Value Upsert(Request& request);
  Json::Value DeleteDocument(Request& request);
  Json::Value Commit(Request& request);
  Json::Value Search(Request& request);
  Json::Value List(Request& request);

  Catalog& catalog_;
};

}  // namespace searchd
