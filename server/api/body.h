// How the body of a request becomes parameters.
#ifndef VORN_SERVER_BODY_H
#define VORN_SERVER_BODY_H

#include <json/value.h>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "budget.h"
#include "http.h"
#include "json_input.h"

namespace vorn::server {

// A body, and the files and memory that it holds until the request is answered. The network thread receives it, a
// worker takes the parameters and destroys it. The whole body is kept in memory, so that the network thread never
// touches a file.
class Body {
 public:
  virtual ~Body() = default;

  // Sets the length that the sender declares. Its memory is allocated in one block at the first piece: a block that
  // grows leaves holes in the heap, which the budget of bodies does not know.
  void Announce(std::uint64_t length);

  // Checks and appends the next piece. A response refuses the request.
  std::optional<Response> Receive(std::string_view piece);

  std::size_t size() const { return text_.size(); }        // bytes received
  std::size_t memory() const { return text_.capacity(); }  // bytes allocated for them

  // Returns the parameter object, or a response that refuses the request. Called once, after the last piece.
  virtual std::variant<Json::Value, Response> TakeParameters() = 0;

  // The paths of the files that were uploaded, as they are in the parameters. Valid after TakeParameters().
  virtual std::vector<std::string> Uploads() const { return {}; }

 protected:
  Body(std::size_t most_bytes, Response (*too_large)()) : most_bytes_(most_bytes), too_large_(too_large) {}

  std::string_view text() const { return text_; }

 private:
  // Checks the next piece, as far as that takes little time: the network thread waits for it.
  virtual std::optional<Response> Check(std::string_view /*piece*/) { return std::nullopt; }

  const std::size_t most_bytes_;
  Response (*const too_large_)();
  std::size_t announced_ = 0;
  std::string text_;
};

// The suffix that the server appends to the name of a parameter to name the path of the uploaded file. A caller must
// not use such a name, because it could otherwise have any file of the machine read.
constexpr std::string_view kUploadSuffix = "_tmp";
bool IsReservedName(std::string_view name);
Response ReservedName(std::string_view name);

// One JSON object. An empty body is an empty object.
class JsonBody : public Body {
 public:
  static constexpr std::size_t kMaxBytes = std::size_t{1024} * 1024;
  static Response TooLarge();

  // A method that asks for all parameters in one object has a second copy of them in memory.
  static constexpr std::size_t kCopies = 2;
  // The largest charge of one body.
  static constexpr std::size_t kMaxCharge = LargestJsonCost(kMaxBytes) * kCopies;

  // Charges the memory of the parsed parameters to `budget`, which must outlive this. Parameters for which it has no
  // memory at the moment are refused with 503, those for which it never has with 413.
  explicit JsonBody(Budget& budget) : Body(kMaxBytes, TooLarge), budget_(budget) {}
  ~JsonBody() override;

  std::variant<Json::Value, Response> TakeParameters() override;

 private:
  std::variant<Json::Value, Response> Parse();

  Budget& budget_;
  std::optional<Charge> charge_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_BODY_H
