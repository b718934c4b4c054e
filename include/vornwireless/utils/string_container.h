// Conversions between the string containers of the tree: std::vector, std::set, a Json::Value
// array and the platform's VLIBSZLIST.
#ifndef VORNWIRELESS_UTILS_STRING_CONTAINER_H
#define VORNWIRELESS_UTILS_STRING_CONTAINER_H

#include <json/value.h>

#include <set>
#include <string>
#include <vector>

#include "vornplatform/szhash.h"

namespace vornwireless {
namespace utils {

using StrVector = std::vector<std::string>;
using StrSet = std::set<std::string>;

// One LOG_INFO line each; containers joined by blanks.
void Print(Json::Value const& value);
void Print(StrVector const& items);
void Print(StrSet const& items);

// "null" for a null value, else the styled form.
std::string ConvertToString(Json::Value const& value);
// Elements from start, count of them (-1: to the end), joined by separator. A non-array value,
// a negative start or an element that is no string gives "" and an error line.
std::string ConvertToString(Json::Value const& array, std::string const& separator, int start = 0,
                            int count = -1);
std::string ConvertToString(StrVector const& items, std::string const& separator, int start = 0,
                            int count = -1);
std::string ConvertToString(StrSet const& items, std::string const& separator, int start = 0,
                            int count = -1);

// A null list gives an empty array.
Json::Value ConvertToJsonArray(PVLIBSZLIST list);
Json::Value ConvertToJsonArray(StrVector const& items);
Json::Value ConvertToJsonArray(StrSet const& items);

// Cleans list and pushes every element: the new count, -1 for a null list or a failed push.
int ConvertToVLIBList(Json::Value const& array, PVLIBSZLIST& list);
int ConvertToVLIBList(StrVector const& items, PVLIBSZLIST& list);
int ConvertToVLIBList(StrSet const& items, PVLIBSZLIST& list);

StrSet ConvertToSet(PVLIBSZLIST list);
StrSet ConvertToSet(StrVector const& items);
StrSet ConvertToSet(Json::Value const& array);  // string elements only (others logged, skipped)
StrVector ConvertToVector(PVLIBSZLIST list);
StrVector ConvertToVector(StrSet const& items);
StrVector ConvertToVector(Json::Value const& array);

int Find(std::string const& item, StrVector const& items);  // first index, or -1
bool IsExist(std::string const& item, StrVector const& items);
void Remove(std::string const& item, StrVector& items);     // first occurrence

// A negative count, or one beyond the end, runs to the end; a start beyond the end is empty.
StrVector GetElementInRange(StrVector const& items, int start, int count);

// Elements of a not in b; a copy of a when either is empty. The vector form is sorted without
// duplicates (except for that copy).
StrSet GetDiff(StrSet const& a, StrSet const& b);
StrVector GetDiff(StrVector const& a, StrVector const& b);
// Sorted elements in both; empty when either is empty.
StrSet GetIntersection(StrSet const& a, StrSet const& b);
StrVector GetIntersection(StrVector const& a, StrVector const& b);
// Sorts, removes duplicates, returns the new size.
int GetUniqueStrVector(StrVector& items);

// Splits at any of the separators, trims each piece, drops empty ones. NULLs give nothing.
StrVector ParseToVector(char const* text, char const* separators);
Json::Value ParseToJsonArray(char const* text, char const* separators);
StrSet ParseToSet(char const* text, char const* separators);

}  // namespace utils
}  // namespace vornwireless

#endif
