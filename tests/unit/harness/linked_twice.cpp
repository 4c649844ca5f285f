#include <webapi/testing/TestHost.h>

int main() {
  const QELO::TestHost host;
  return 0;
}
