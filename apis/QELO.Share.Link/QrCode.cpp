#include "QrCode.h"

#include <qrencode.h>

#include <memory>

namespace share {
namespace {

constexpr int kBorder = 4;           ///< empty modules on each side
constexpr unsigned char kBlack = 1;  ///< the bit of a module that says its colour

struct Free {
  void operator()(QRcode* code) const { QRcode_free(code); }
};

/// The black modules of a row, from left to right, as one rectangle each run.
void drawRow(const unsigned char* row, int width, int y, std::string& path) {
  for (int x = 0; x < width;) {
    int end = x;
    while (end < width && (row[end] & kBlack) != 0) {
      ++end;
    }
    if (end > x) {
      const std::string length = std::to_string(end - x);
      path += "M" + std::to_string(x + kBorder) + " " + std::to_string(y + kBorder) + "h" + length +
              "v1h-" + length + "z";
    }
    x = end + 1;
  }
}

}  // namespace

bool drawQrCode(const std::string& text, std::string& svg) {
  const bool isText = text.find('\0') == std::string::npos;
  const std::unique_ptr<QRcode, Free> code(
      isText ? QRcode_encodeString8bit(text.c_str(), 0, QR_ECLEVEL_M) : nullptr);
  if (code == nullptr) {
    return false;
  }
  std::string path;
  for (int y = 0; y < code->width; ++y) {
    drawRow(code->data + y * code->width, code->width, y, path);
  }
  const std::string size = std::to_string(code->width + 2 * kBorder);
  svg = "<svg xmlns=\"http://www.w3.org/2000/svg\" viewBox=\"0 0 " + size + " " + size +
        "\" shape-rendering=\"crispEdges\"><path fill=\"#fff\" d=\"M0 0h" + size + "v" + size +
        "H0z\"/><path d=\"" + path + "\"/></svg>";
  return true;
}

}  // namespace share
