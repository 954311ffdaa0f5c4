#include "host/searchd/plan.h"

namespace searchd {
namespace {

bool IsOfTitle(Role role) { return role == Role::kTitle || role == Role::kInsideTitle; }
bool IsOfKeywords(Role role) { return role == Role::kKeywords; }

void AddViews(std::vector<View>& views, const Reading& reading, double factor) {
  if (reading.empty()) return;
  if (reading.size() > 1) {
    views.push_back({&reading, IsOfTitle, factor});
    views.push_back({&reading, IsOfKeywords, factor});
    factor *= kScattered;
  }
  views.push_back({&reading, IsAny, factor});
}

}  // namespace

bool IsAny(Role) { return true; }

std::vector<View> ViewsOf(const Plan& plan) {
  std::vector<View> views;
  AddViews(views, plan.parts, 1);
  AddViews(views, plan.words, kApart);
  return views;
}

}  // namespace searchd
