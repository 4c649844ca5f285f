#pragma once

namespace QELO {

/// What a client's user-agent header tells of its device and browser.
struct UserAgent {
  bool mobileDevice = false;
  bool iPhone = false;  ///< any iOS device, an iPad too
  bool android = false;
  bool ieMobile = false;  ///< a mobile device that names "msie" or "iemobile"
  bool iPad = false;
  bool playBook = false;
  bool blackBerry6 = false;  ///< a BlackBerry whose browser is WebKit
  bool webKit = false;
  bool supportWebApp = false;  ///< a WebKit browser of one of the brands above

  /// @param header  in lower case
  /// @param profiled  whether the request has another header that only mobile devices send; it
  ///                  decides when this one names no mobile device
  static UserAgent Classify(const char* header, bool profiled);
};

}  // namespace QELO
