#include "clients_handler.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "clients.h"
#include "core.h"
#include "json_values.h"
#include "listing_page.h"
#include "log.h"
#include "parameter_reader.h"

namespace {

constexpr char kSource[] = "clients_handler";
constexpr std::int64_t kLargestID = UINT32_MAX;

Json::Value NumberOrNull(const std::optional<std::uint64_t>& number) {
  return number ? Json::Value(Json::UInt64{*number}) : Json::Value();
}

Json::Value NumberOrNull(const std::optional<std::int64_t>& number) {
  return number ? Json::Value(Json::Int64{*number}) : Json::Value();
}

Json::Value ToJson(const VORN::ClientExport& used) {
  Json::Value item;
  item["path"] = used.path;
  item["mounted"] = used.is_mounted;
  item["rule"] = OrNull(used.rule);
  item["bytes_read"] = NumberOrNull(used.bytes_read);
  item["bytes_written"] = NumberOrNull(used.bytes_written);
  item["since"] = NumberOrNull(used.since);
  return item;
}

Json::Value ToJson(const VORN::ClientRefusal& refusal) {
  Json::Value item;
  item["path"] = OrNull(refusal.path);
  item["reason"] = refusal.reason;
  item["text"] = refusal.text;
  item["count"] = refusal.count == 0 ? Json::Value() : Json::Value(refusal.count);
  item["last"] = NumberOrNull(refusal.last);
  return item;
}

Json::Value ToJson(const VORN::NFSClient& client) {
  Json::Value item;
  item["address"] = OrNull(client.address);
  item["name"] = OrNull(client.name);
  item["version"] = OrNull(client.version);
  item["state"] = OrNull(client.state);
  item["since"] = NumberOrNull(client.since);
  item["id"] = NumberOrNull(client.id);
  item["client_id"] = OrNull(client.client_id);
  item["implementation"] = OrNull(client.implementation);
  item["renewed"] = NumberOrNull(client.renewed);
  item["open_files"] = NumberOrNull(client.open_files);
  item["locks"] = NumberOrNull(client.locks);
  item["delegations"] = NumberOrNull(client.delegations);
  item["exports"] = ArrayOf(client.exports, ToJson);
  item["refusals"] = ArrayOf(client.refusals, ToJson);
  return item;
}

}  // namespace

void ClientsHandler::List() {
  AnswerWith(HERE, [this](Json::Value& result) { return ListData(Parameters(), result); });
}

void ClientsHandler::Disconnect() {
  AnswerTo(HERE, [this](const Json::Value& params) { return DisconnectData(params); });
}

bool ClientsHandler::ListData(const Json::Value& params, Json::Value& result) {
  ParameterReader reader(HERE, params);
  const std::string filter = reader.Text("filter");
  const ListingPage page = ListingPage::Read(reader);
  if (!reader.ok()) return Fail(kBadParameter);
  std::vector<VORN::NFSClient> clients;
  int total = 0;
  if (VORN::ListClients(filter, page.offset, page.limit, &clients, &total) < 0) {
    LOG_ERROR("Failed to ListClients, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  result["clients"] = ArrayOf(clients, ToJson);
  result["total"] = total;
  return true;
}

bool ClientsHandler::DisconnectData(const Json::Value& params) {
  ParameterReader reader(HERE, params);
  const std::int64_t id = reader.Integer("id", -1, 0, kLargestID);
  const std::string client_id = reader.NeededText("client_id");
  if (!reader.ok() || id < 0) return Fail(kBadParameter);
  const int disconnected = VORN::DisconnectClient(static_cast<std::uint64_t>(id), client_id);
  if (disconnected < 0) {
    LOG_ERROR("Failed to DisconnectClient, vornerr=[0x%04X]", KLIBCErrGet());
    return disconnected == VORN::kClientsGone ? Fail(kClientGone) : Fail(kPlatformFailure);
  }
  return true;
}
