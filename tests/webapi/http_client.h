// A client that sends whatever bytes it is told to.
#ifndef TESTS_WEBAPI_HTTP_CLIENT_H
#define TESTS_WEBAPI_HTTP_CLIENT_H

#include <chrono>
#include <cstdint>
#include <map>
#include <string>
#include <string_view>

namespace vorntest {

struct HttpAnswer {
  int status = 0;                            ///< 0: none came, the connection was closed or the time was over
  std::map<std::string, std::string> fields; ///< names in lower case
  std::string body;
};

class HttpClient {
public:
  /// @param[in] receiveBuffer  in bytes; 0: the system's
  /// @param[in] from           this end's address in 127.0.0.0/8, as a number; 0: the system's choice
  explicit HttpClient(int port, int receiveBuffer = 0, uint32_t from = 0);
  HttpClient(const HttpClient &) = delete;
  HttpClient &operator=(const HttpClient &) = delete;
  ~HttpClient() { Close(); }

  bool Connected() const { return descriptor_ >= 0; }
  int Descriptor() const { return descriptor_; }
  void Close();
  void Reset();        ///< closes with a reset
  void CloseWriting(); ///< half-closes

  /// @return false when the server has closed the connection
  bool Send(std::string_view bytes);
  HttpAnswer Read(std::chrono::milliseconds limit = std::chrono::seconds(10));
  HttpAnswer Exchange(std::string_view bytes) { return Send(bytes) ? Read() : HttpAnswer{}; }

  /// The server has closed its side, within the limit, and sent nothing more.
  bool ClosedByServer(std::chrono::milliseconds limit = std::chrono::seconds(10));
  /// Bytes that came so far and were not taken by Read; waits for some.
  std::string Bytes(std::chrono::milliseconds limit);

private:
  bool Receive(std::chrono::steady_clock::time_point deadline);

  int descriptor_ = -1;
  std::string buffer_;
  bool ended_ = false;
};

/// A good call's bytes.
/// @param[in] path  as /webapi/ has it behind: "VORN.Test.Echo/1/get"
std::string CallBytes(const std::string &path, const std::string &body = "", const std::string &fields = "");

/// One call on a connection of its own.
HttpAnswer Call(int port, const std::string &path, const std::string &body = "", const std::string &fields = "");

} // namespace vorntest

#endif
