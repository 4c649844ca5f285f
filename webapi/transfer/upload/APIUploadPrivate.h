#pragma once

#include <json/json.h>

#include <string>

#include "webapi/APIUpload.h"
#include "webapi/platform/Upload.h"

namespace QELO {

class APIUploadPrivate {
 public:
  APIUploadPrivate(APIUpload* owner, APIRequest* request) : owner_(owner), request_(request) {}
  APIUploadPrivate(const APIUploadPrivate&) = delete;
  APIUploadPrivate& operator=(const APIUploadPrivate&) = delete;
  ~APIUploadPrivate() { QLIBCSzHashFree(parameters_); }

  void SetCallback(QeloCgiUploadProgress callback) { progress_ = callback; }
  int GetUploadAll(Json::Value& params, Json::Value* tmpFiles);
  int GetUploadParam(Json::Value& params);
  int GetUploadFile(Json::Value& params);

  bool HasFile() const { return part_[0] != '\0' && field_[0] != '\0' && file_[0] != '\0'; }
  std::string Field() const { return HasFile() ? field_ : ""; }
  std::string FileName() const { return HasFile() ? file_ : ""; }
  Json::Value Files() const;
  static Json::Value Slice();

 private:
  void AddFile(const std::string& field, const std::string& name, const std::string& path);
  bool TakeParameters(Json::Value& params);

  APIUpload* owner_;
  APIRequest* request_;
  QeloCgiUploadProgress progress_ = nullptr;
  QeloCgiUploadState state_{};
  QLIBSZHASH* parameters_ = nullptr;
  char part_[256] = {};  ///< the header of the file that follows; "" when none does
  char field_[64] = {};  ///< its field
  char file_[491] = {};  ///< its name
};

}  // namespace QELO
