#include "webapi/ExecParam.h"

#include "webapi/JsonHelper.h"
#include "webapi/runner/exec/ExecParamPrivate.h"

namespace QELO {
namespace {

const Json::Value& emptyObject() {
  static const Json::Value object(Json::objectValue);
  return object;
}

}  // namespace

ExecParamPrivate::ExecParamPrivate() {
  Restore(Json::Value());
}

void ExecParamPrivate::Restore(const Json::Value& record) {
  if (record.isObject()) {
    store_ = record;
  }
  for (const char* section : {"params", "env", "attr", "runner", "output"}) {
    InitField(section);
  }
}

ExecParam::ExecParam() : private_(std::make_unique<ExecParamPrivate>()) {}

ExecParam::ExecParam(const Json::Value& record) : ExecParam() {
  private_->Restore(record);
}

ExecParam::ExecParam(const ExecParam& other)
    : private_(std::make_unique<ExecParamPrivate>(*other.private_)) {}

ExecParam& ExecParam::operator=(const ExecParam& other) {
  *private_ = *other.private_;
  return *this;
}

ExecParam::~ExecParam() = default;

ExecParam& ExecParam::SetAPI(const std::string& api) {
  private_->SetData("params", "api", api, true);
  return *this;
}

ExecParam& ExecParam::SetVersion(int version) {
  private_->SetData("params", "version", version, false);
  return *this;
}

ExecParam& ExecParam::SetMethod(const std::string& method) {
  private_->SetData("params", "method", method, true);
  return *this;
}

ExecParam& ExecParam::SetParams(const Json::Value& params) {
  private_->SetData("params", params, false);
  return *this;
}

ExecParam& ExecParam::SetEnv(const Json::Value& env) {
  private_->SetData("env", env, false);
  return *this;
}

ExecParam& ExecParam::SetAttr(const Json::Value& attributes) {
  private_->SetData("attr", attributes, false);
  return *this;
}

ExecParam& ExecParam::SetRunner(const std::string& user) {
  private_->SetData("runner", "username", user, true);
  return *this;
}

ExecParam& ExecParam::SetOutputFd(int fd) {
  private_->SetData("output", "fd", fd, false);
  return *this;
}

std::string ExecParam::GetAPI() const {
  return JsonHelper::asString(private_->GetData("params", "api", ""));
}

int ExecParam::GetVersion() const {
  return JsonHelper::asInt(private_->GetData("params", "version", 0));
}

std::string ExecParam::GetMethod() const {
  return JsonHelper::asString(private_->GetData("params", "method", ""));
}

Json::Value ExecParam::GetParams() const {
  return private_->GetData("params", emptyObject());
}

Json::Value ExecParam::GetEnv() const {
  return private_->GetData("env", emptyObject());
}

Json::Value ExecParam::GetAttr() const {
  return private_->GetData("attr", emptyObject());
}

std::string ExecParam::GetRunner() const {
  return JsonHelper::asString(private_->GetData("runner", "username", ""));
}

int ExecParam::GetOutputFd() const {
  return JsonHelper::asInt(private_->GetData("output", "fd", -1), -1);
}

Json::Value& ExecParam::Serialize() {
  return private_->Serialize();
}

void ExecParam::Deserialize(Json::Value& record) {
  private_->Deserialize(record);
}

}  // namespace QELO
