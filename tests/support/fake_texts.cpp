#include "tests/support/fake_texts.h"

#include "device/tovo_webui.h"

namespace test {

FakeTexts& Texts() {
  static FakeTexts texts;
  return texts;
}

}  // namespace test

Json::Value TOVO::PMX::LocalizedStringParser::ParseTexts(std::string dir) {
  test::Texts().dirs.push_back(dir);
  return test::Texts().parse ? test::Texts().parse(dir) : Json::Value();
}
