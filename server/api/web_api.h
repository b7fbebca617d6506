// What the server offers: the methods of the loaded modules, their list, and a sign of life.
#ifndef VORN_SERVER_WEB_API_H
#define VORN_SERVER_WEB_API_H

#include <memory>
#include <optional>
#include <string_view>
#include <variant>

#include "http.h"
#include "routes.h"
#include "upload.h"
#include "worker_pool.h"

namespace vorn::server {

class WebApi : public Service {
 public:
  // All must outlive this.
  WebApi(const Routes& routes, const UploadFolder& uploads, WorkerPool& pool);

  std::variant<std::shared_ptr<Exchange>, Response> Begin(const Head& head) override;
  Response Refuse(int status, std::string_view text) const override;

 private:
  std::optional<Response> AnswerPage(const Head& head) const;

  const Routes& routes_;
  const UploadFolder& uploads_;
  WorkerPool& pool_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_WEB_API_H
