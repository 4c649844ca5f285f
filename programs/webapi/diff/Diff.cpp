#include "programs/webapi/diff/Diff.h"

#include <cstdio>
#include <string>
#include <vector>

#include "programs/webapi/check/Words.h"
#include "programs/webapi/diff/Changes.h"
#include "programs/webapi/diff/CompareAPI.h"
#include "programs/webapi/text/DescriptionText.h"
#include "webapi/APIDescription.h"
#include "webapi/JsonHelper.h"

namespace QELO::AuthorProgram {
namespace {

constexpr char kHelp[] =
    "webapi diff OLD NEW\n"
    "    Compares two descriptions, as of a version that is installed and the next. A line tells\n"
    "    what has changed, and where: FILE:LINE:COLUMN: breaks: ... for what callers can do no\n"
    "    longer, methods, parameters and results that are gone or tightened; \"changes:\" for "
    "what\n"
    "    they should know, \"new:\" for what is more.\n"
    "    --breaks  tells only what breaks\n"
    "\n"
    "Exit status: 0 no caller breaks; 1 callers may; 2 wrong use, or a file cannot be used.\n";

/// Reads a description. @return what is wrong, or ""
std::string read(const std::string& path, DescriptionText& text) {
  const std::string wrong = text.ReadFile(path);
  if (!wrong.empty()) {
    return wrong;
  }
  if (!text.Root().isObject()) {
    return Shown(path) + ": it must be an object";
  }
  for (auto it = text.Root().begin(); it != text.Root().end(); ++it) {
    std::string fault = APIDescription(*it).Fault();
    fault = fault.empty() ? TooMuchIn(*it) : fault;
    if (!fault.empty()) {
      return PlaceText(path, text.PositionAt(static_cast<size_t>(it->getOffsetStart()))) +
             "error: no description of " + Quoted(it.name()) + ": " + fault;
    }
  }
  return "";
}

void compareAll(const Json::Value& before, const Json::Value& after, Changes& changes) {
  for (auto it = before.begin(); it != before.end() && !changes.IsFull(); ++it) {
    const Json::Value* now = JsonHelper::find(after, it.name());
    if (now != nullptr) {
      CompareAPI(*it, *now, changes);
    } else {
      changes.AddAtName(Changes::kBreaks, Changes::kOld, *it,
                        "the API " + Quoted(it.name()) + " is gone");
    }
  }
  for (auto it = after.begin(); it != after.end() && !changes.IsFull(); ++it) {
    if (!JsonHelper::hasMember(before, it.name())) {
      changes.AddAtName(Changes::kNew, Changes::kNewer, *it, "the API " + Quoted(it.name()));
    }
  }
}

}  // namespace

ExitCode Diff(const Arguments& arguments) {
  if (AsksForHelp(arguments)) {
    fputs(kHelp, stdout);
    return kDone;
  }
  bool breaksAlone = false;
  std::vector<std::string> words;
  const std::string wrong = ReadArguments(arguments, {{"--breaks", nullptr, &breaksAlone}}, words);
  if (!wrong.empty() || words.size() != 2) {
    return WrongUse("diff", wrong.empty() ? "two files are needed" : wrong);
  }
  const std::string paths[2] = {words[0], words[1]};
  DescriptionText texts[2];
  for (const int side : {0, 1}) {
    const std::string fault = read(paths[side], texts[side]);
    if (!fault.empty()) {
      fprintf(stderr, "webapi diff: %s\n", fault.c_str());
      return kWrongUse;
    }
  }
  Changes changes;
  compareAll(texts[0].Root(), texts[1].Root(), changes);
  for (const std::string& line : changes.Lines(paths, texts, breaksAlone)) {
    printf("%s\n", line.c_str());
  }
  return changes.Breaks() ? kFailed : kDone;
}

}  // namespace QELO::AuthorProgram
