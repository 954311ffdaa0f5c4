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
  void Reopen() override;
  bool HasIdleWork() override;
  void DoIdleWork() override;

 private:
  struct Request {
    Json::Value data;
    std::size_t bytes = 0;
    std::function<void()> after;
  };
  // Returns the text of the members that the reply has beside "success".
  struct Command {
    bool changes;
    std::string (Dispatcher::*run)(Request&);
  };

  static const Command& FindCommand(const std::string& name);
  std::string Run(const std::string& text, uid_t client, std::function<void()>& after);
  void ApplyAfterReply(Request& request, const std::shared_ptr<Index>& index);

  std::string Create(Request& request);
  std::string Delete(Request& request);
  std::string Upsert(Request& request);
  std::string DeleteDocument(Request& request);
  std::string Commit(Request& request);
  std::string Search(Request& request);
  std::string List(Request& request);

  Catalog& catalog_;
};

}  // namespace searchd
