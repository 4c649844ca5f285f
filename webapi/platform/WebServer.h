#pragma once

#include <memory>

#include "webapi/Export.h"

/// The host's web-server control library.
namespace qelow3 {

struct EnginePrivate;

/// Reads how the host's web server is controlled; throws std::runtime_error when that is not
/// configured.
class WEBAPI_API Engine {
 public:
  Engine();
  ~Engine();
  const EnginePrivate& Settings() const { return *private_; }

 private:
  std::shared_ptr<EnginePrivate> private_;
};

/// The controller for this operating environment.
class WEBAPI_API ARDO {
 public:
  explicit ARDO(const Engine& engine);
  ~ARDO();
  /// Restarts the web server without cutting off running requests. @return false on failure
  bool RestartService();

 private:
  const Engine& engine_;
};

}  // namespace qelow3
