// What looks at items and changes nothing: list, stat.

#include <utility>

#include "calls/Call.h"
#include "calls/ItemJson.h"
#include "calls/Methods.h"
#include "paths/Listing.h"

namespace files {
namespace {

using QELO::APIRequest;

constexpr unsigned kItemsUnlessTold = 500;

template <typename T>
struct Choice {
  const char* word;
  T value;
};

constexpr Choice<Listing::Order> kOrders[] = {{"name", Listing::Order::kName},
                                              {"size", Listing::Order::kSize},
                                              {"mtime", Listing::Order::kTime},
                                              {"type", Listing::Order::kType}};
constexpr Choice<bool> kDirections[] = {{"asc", false}, {"desc", true}};
constexpr Choice<Listing::Kind> kKinds[] = {{"all", Listing::Kind::kAll},
                                            {"file", Listing::Kind::kFiles},
                                            {"folder", Listing::Kind::kFolders}};

/// The parameter `name`, one of some words. @return false when it is another
template <typename T, size_t kCount>
bool readChoice(const APIRequest& request, const char* name, const Choice<T> (&choices)[kCount],
                T& value) {
  const auto word = request.GetAndCheckString(name, APIRequest::PARAM_OPTIONAL);
  if (!word.IsSet()) {
    return true;
  }
  for (const Choice<T>& choice : choices) {
    if (word.Get() == choice.word && !word.IsInvalid()) {
      value = choice.value;
      return true;
    }
  }
  return false;
}

/// The parameter `name`, up to `most`. @return false when it is no such number
bool readCount(const APIRequest& request, const char* name, unsigned most, unsigned& value) {
  const auto number =
      request.GetAndCheckIntegral<unsigned int>(name, APIRequest::PARAM_OPTIONAL, nullptr);
  if (number.IsInvalid() || number.IsReset() || number.Get(0) > most) {
    return false;
  }
  value = number.Get(value);
  return true;
}

bool readWish(const APIRequest& request, Listing::Wish& wish) {
  wish.limit = kItemsUnlessTold;
  const auto pattern = request.GetAndCheckString("pattern", APIRequest::PARAM_OPTIONAL);
  wish.pattern = pattern.Get();
  return !pattern.IsInvalid() && wish.pattern.size() <= Listing::kLongestPattern &&
         readChoice(request, "sort_by", kOrders, wish.order) &&
         readChoice(request, "sort_order", kDirections, wish.descending) &&
         readChoice(request, "type", kKinds, wish.kind) &&
         readCount(request, "offset", Listing::kFarthest, wish.offset) &&
         readCount(request, "limit", Listing::kMostItems, wish.limit) &&
         wish.offset + wish.limit <= Listing::kFarthest;
}

Json::Value pageOf(const VirtualPath& path, const Listing::Wish& wish, uint64_t total) {
  Json::Value page(Json::objectValue);
  page["path"] = path.Text();
  page["offset"] = wish.offset;
  page["total"] = Json::UInt64{total};
  page["items"] = Json::Value(Json::arrayValue);
  return page;
}

/// The shared folders that there are for the caller, in the order of the configuration.
Json::Value sharesOf(const Call& call, const Listing::Wish& wish) {
  std::vector<const Share*> shown;
  for (const Share& share : call.SharedFolders().All()) {
    if (wish.kind != Listing::Kind::kFiles &&
        (wish.pattern.empty() || matches(wish.pattern, share.name))) {
      shown.push_back(&share);
    }
  }
  Json::Value page = pageOf(VirtualPath(), wish, shown.size());
  for (size_t i = wish.offset; i < shown.size() && i - wish.offset < wish.limit; ++i) {
    page["items"].append(jsonOf(*shown[i]));
  }
  return page;
}

/// @return false when it was refused, which is the answer
bool addItem(Call& call, const VirtualPath& path, Json::Value& items) {
  Located located;
  Item item;
  if (!call.Locate(path, located)) {
    return false;
  }
  if (const Reason reason = located.Look(item); reason != Reason::kNone) {
    return call.Refuse(reason, path);
  }
  item.name = path.Name();
  items.append(jsonOf(path.Parent(), item));
  return true;
}

}  // namespace

void list(APIRequest* request, QELO::APIResponse* response) {
  Call call(request, response);
  VirtualPath path;
  Listing::Wish wish;
  if (!call.ReadPath("path", path)) {
    return;
  }
  if (!readWish(*request, wish)) {
    call.RefuseParameters();
    return;
  }
  if (path.IsRoot()) {
    response->SetSuccess(sharesOf(call, wish));
    return;
  }
  Folder folder;
  if (!call.OpenFolder(path, folder)) {
    return;
  }
  std::vector<Item> items;
  uint64_t total = 0;
  if (const Reason reason = Listing::Read(folder, wish, items, total); reason != Reason::kNone) {
    call.Refuse(reason, path);
    return;
  }
  Json::Value page = pageOf(path, wish, total);
  for (const Item& item : items) {
    page["items"].append(jsonOf(path, item));
  }
  response->SetSuccess(page);
}

void stat(APIRequest* request, QELO::APIResponse* response) {
  Call call(request, response);
  std::vector<VirtualPath> paths;
  if (!call.ReadPaths("path", paths)) {
    return;
  }
  Json::Value data(Json::objectValue);
  data["items"] = Json::Value(Json::arrayValue);
  for (const VirtualPath& path : paths) {
    if (!addItem(call, path, data["items"])) {
      return;
    }
  }
  response->SetSuccess(data);
}

}  // namespace files
