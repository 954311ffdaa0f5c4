// The JSON library's strict reader by itself: what the library's reading is measured against.
#pragma once

#include <json/reader.h>

#include <memory>
#include <stdexcept>
#include <string>

namespace bench {

class BareJson {
 public:
  BareJson() {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    reader_.reset(builder.newCharReader());
  }

  Json::Value Parse(const std::string& text) const {
    Json::Value value;
    if (!reader_->parse(text.data(), text.data() + text.size(), &value, nullptr)) {
      throw std::runtime_error("not JSON: " + text);
    }
    return value;
  }

 private:
  std::unique_ptr<Json::CharReader> reader_;
};

}  // namespace bench
