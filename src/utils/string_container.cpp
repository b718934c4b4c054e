#include "vornwireless/utils/string_container.h"

#include <json/writer.h>

#include <algorithm>
#include <cstring>
#include <exception>
#include <iterator>
#include <vector>

#include "vornplatform/log.h"
#include "vornplatform/str.h"

namespace vornwireless {
namespace utils {

namespace {

template <typename Container>
std::string Join(Container const& items, std::string const& separator) {
  std::string out;
  bool first = true;
  for (auto const& item : items) {
    if (!first) out += separator;
    out += item;
    first = false;
  }
  return out;
}

// Joins the range [start, start+count) (count < 0: to the end) of a string container.
template <typename Container>
std::string JoinRange(Container const& items, std::string const& separator, int start, int count) {
  if (start < 0) {
    VORN_LOG(LOG_ERR, "Bad Parameter.");
    return "";
  }
  std::string out;
  int index = 0;
  int taken = 0;
  for (auto const& item : items) {
    if (index++ < start) continue;
    if (count >= 0 && taken >= count) break;
    if (taken++ > 0) out += separator;
    out += item;
  }
  return out;
}

template <typename Container>
int FillList(Container const& items, PVLIBSZLIST& list) {
  if (!list) return -1;
  VLIBCSzListClean(list);
  for (auto const& item : items) {
    if (VLIBCSzListPush(&list, item.c_str()) < 0) {
      VORN_LOG(LOG_ERR, "Failed to push [%s] to list", item.c_str());
      return -1;
    }
  }
  return list->nItem;
}

// The string elements of a Json array; other elements are logged and skipped.
StrVector JsonStrings(Json::Value const& array) {
  StrVector out;
  if (!array.isArray()) {
    if (!array.isNull()) VORN_LOG(LOG_ERR, "Bad Parameter.");
    return out;
  }
  for (Json::Value::ArrayIndex i = 0; i < array.size(); ++i) {
    if (array[i].isString()) {
      out.push_back(array[i].asString());
    } else {
      VORN_LOG(LOG_ERR, "Element %u is not a string", i);
    }
  }
  return out;
}

StrVector ListStrings(PVLIBSZLIST list) {
  StrVector out;
  if (!list) return out;
  for (int i = 0; i < list->nItem; ++i) {
    if (list->pszItem[i]) out.push_back(list->pszItem[i]);
  }
  return out;
}

}  // namespace

void Print(Json::Value const& value) {
  Json::FastWriter writer;
  std::string text = writer.write(value);
  if (!text.empty() && text.back() == '\n') text.pop_back();
  VORN_LOG(LOG_INFO, "%s", text.c_str());
}

void Print(StrVector const& items) { VORN_LOG(LOG_INFO, "%s", Join(items, " ").c_str()); }

void Print(StrSet const& items) { VORN_LOG(LOG_INFO, "%s", Join(items, " ").c_str()); }

std::string ConvertToString(Json::Value const& value) {
  if (value.isNull()) return "null";
  return value.toStyledString();
}

std::string ConvertToString(Json::Value const& array, std::string const& separator, int start,
                            int count) {
  if (!array.isArray() || start < 0) {
    VORN_LOG(LOG_ERR, "Bad Parameter.");
    return "";
  }
  std::string out;
  int taken = 0;
  for (Json::Value::ArrayIndex i = static_cast<Json::Value::ArrayIndex>(start); i < array.size();
       ++i) {
    if (count >= 0 && taken >= count) break;
    if (!array[i].isConvertibleTo(Json::stringValue) || array[i].isNull()) {
      VORN_LOG(LOG_ERR, "Failed to convert element %u to string", i);
      return "";
    }
    if (taken++ > 0) out += separator;
    out += array[i].asString();
  }
  return out;
}

std::string ConvertToString(StrVector const& items, std::string const& separator, int start,
                            int count) {
  return JoinRange(items, separator, start, count);
}

std::string ConvertToString(StrSet const& items, std::string const& separator, int start,
                            int count) {
  return JoinRange(items, separator, start, count);
}

Json::Value ConvertToJsonArray(PVLIBSZLIST list) { return ConvertToJsonArray(ListStrings(list)); }

Json::Value ConvertToJsonArray(StrVector const& items) {
  Json::Value out(Json::arrayValue);
  for (auto const& item : items) out.append(item);
  return out;
}

Json::Value ConvertToJsonArray(StrSet const& items) {
  Json::Value out(Json::arrayValue);
  for (auto const& item : items) out.append(item);
  return out;
}

int ConvertToVLIBList(Json::Value const& array, PVLIBSZLIST& list) {
  return FillList(JsonStrings(array), list);
}
int ConvertToVLIBList(StrVector const& items, PVLIBSZLIST& list) { return FillList(items, list); }
int ConvertToVLIBList(StrSet const& items, PVLIBSZLIST& list) { return FillList(items, list); }

StrSet ConvertToSet(PVLIBSZLIST list) {
  StrVector v = ListStrings(list);
  return StrSet(v.begin(), v.end());
}
StrSet ConvertToSet(StrVector const& items) { return StrSet(items.begin(), items.end()); }
StrSet ConvertToSet(Json::Value const& array) {
  StrVector v = JsonStrings(array);
  return StrSet(v.begin(), v.end());
}

StrVector ConvertToVector(PVLIBSZLIST list) { return ListStrings(list); }
StrVector ConvertToVector(StrSet const& items) { return StrVector(items.begin(), items.end()); }
StrVector ConvertToVector(Json::Value const& array) { return JsonStrings(array); }

int Find(std::string const& item, StrVector const& items) {
  auto it = std::find(items.begin(), items.end(), item);
  return it == items.end() ? -1 : static_cast<int>(it - items.begin());
}

bool IsExist(std::string const& item, StrVector const& items) { return Find(item, items) >= 0; }

void Remove(std::string const& item, StrVector& items) {
  auto it = std::find(items.begin(), items.end(), item);
  if (it != items.end()) items.erase(it);
}

StrVector GetElementInRange(StrVector const& items, int start, int count) {
  if (start < 0) start = 0;
  if (static_cast<size_t>(start) >= items.size()) return StrVector();
  auto first = items.begin() + start;
  if (count < 0 || static_cast<size_t>(count) > items.size() - static_cast<size_t>(start)) {
    return StrVector(first, items.end());
  }
  return StrVector(first, first + count);
}

StrSet GetDiff(StrSet const& a, StrSet const& b) {
  if (a.empty() || b.empty()) return a;
  StrSet out;
  std::set_difference(a.begin(), a.end(), b.begin(), b.end(), std::inserter(out, out.end()));
  return out;
}

StrVector GetDiff(StrVector const& a, StrVector const& b) {
  if (a.empty() || b.empty()) return a;
  StrVector sa = a, sb = b;
  GetUniqueStrVector(sa);
  GetUniqueStrVector(sb);
  StrVector out;
  std::set_difference(sa.begin(), sa.end(), sb.begin(), sb.end(), std::back_inserter(out));
  return out;
}

StrSet GetIntersection(StrSet const& a, StrSet const& b) {
  StrSet out;
  if (a.empty() || b.empty()) return out;
  std::set_intersection(a.begin(), a.end(), b.begin(), b.end(), std::inserter(out, out.end()));
  return out;
}

StrVector GetIntersection(StrVector const& a, StrVector const& b) {
  StrVector out;
  if (a.empty() || b.empty()) return out;
  StrVector sa = a, sb = b;
  GetUniqueStrVector(sa);
  GetUniqueStrVector(sb);
  std::set_intersection(sa.begin(), sa.end(), sb.begin(), sb.end(), std::back_inserter(out));
  return out;
}

int GetUniqueStrVector(StrVector& items) {
  std::sort(items.begin(), items.end());
  items.erase(std::unique(items.begin(), items.end()), items.end());
  return static_cast<int>(items.size());
}

StrVector ParseToVector(char const* text, char const* separators) {
  StrVector out;
  if (!text || !separators) return out;
  std::vector<char> buf(text, text + strlen(text) + 1);
  char* cursor = buf.data();
  char* piece;
  while ((piece = strsep(&cursor, separators)) != nullptr) {
    VLIBCStrTrimSpace(piece);
    if (*piece) out.push_back(piece);
  }
  return out;
}

Json::Value ParseToJsonArray(char const* text, char const* separators) {
  return ConvertToJsonArray(ParseToVector(text, separators));
}

StrSet ParseToSet(char const* text, char const* separators) {
  return ConvertToSet(ParseToVector(text, separators));
}

}  // namespace utils
}  // namespace vornwireless
