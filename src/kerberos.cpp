#include "kerberos.h"

#include <unistd.h>

#include <string>

#include "core.h"
#include "log.h"
#include "nfsconf.h"
#include "owned.h"
#include "service.h"
#include "settings_change.h"

namespace {

constexpr char kSource[] = "kerberos";
constexpr char kKeytabFile[] = "/etc/nfs/krb5.keytab";

Json::Value EntryToJson(const KeytabEntry& entry) {
  Json::Value object;
  object["version"] = entry.version;
  object["kerberos_principal"] = entry.principal;
  object["enc_type"] = entry.enc_type;
  return object;
}

// Imports the keytab and reloads the service. Returns kNoError, or the error code of the failure that was
// logged. Only the two results below are failures: docs/decisions/0031.
int ImportKeytab(const std::string& path) {
  const int imported = VORNNFSKeytabImport(path.c_str());
  if (imported == VORNNFS_KEYTAB_NO_KEYTAB) {
    LOG_ERROR("Failed to VORNNFSKeytabImport: wrong keytab file format.");
    return kNoKeytab;
  }
  if (imported == VORNNFS_KEYTAB_FAILED) {
    LOG_ERROR("Failed to VORNNFSKeytabImport.");
    return kPlatformFailure;
  }
  if (!ReloadIDMap()) {
    LOG_ERROR("Failed to KLIBCExec, vornerr = [0x%04X]", KLIBCErrGet());
    return kPlatformFailure;
  }
  return kNoError;
}

}  // namespace

void NFSKerberosServiceHandler::Get() {
  AnswerWith(HERE, [this](Json::Value& result) { return GetData(result); });
}

void NFSKerberosServiceHandler::UploadKey() {
  AnswerTo(HERE, [this](const Json::Value& params) { return UploadKeyInternal(params); });
}

void NFSKerberosServiceHandler::List() {
  AnswerWith(HERE, [this](Json::Value& result) { return ListData(result); });
}

bool NFSKerberosServiceHandler::GetData(Json::Value& result) {
  NFSConfRecord record{};
  if (!ReadRecord(HERE, &record)) return Fail(kPlatformFailure);
  result["kerberos_support"] = VORNNFSSupportKerberos() != 0;
  result["kerberos_principal"] = KLIBCFileExist(kKeytabFile) != 0 ? record.kerberos_principal : "";
  return true;
}

bool NFSKerberosServiceHandler::ListData(Json::Value& result) {
  KeytabEntry* head = nullptr;
  const bool failed = VORNNFSKeytabInfoGet(kKeytabFile, &head) < 0;
  const Keytab keytab(head);
  if (failed) {
    LOG_ERROR("Failed to VORNNFSKeytabInfoGet.");
    return Fail(kPlatformFailure);
  }
  Json::Value entries(Json::arrayValue);
  for (const KeytabEntry* entry = keytab.get(); entry != nullptr; entry = entry->next) {
    entries.append(EntryToJson(*entry));
  }
  result["keytab"] = entries;
  return true;
}

bool NFSKerberosServiceHandler::UploadKeyInternal(const Json::Value& params) {
  const VornConf configuration;
  if (VORNNFSSupportKerberos() == 0) {
    LOG_ERROR("not support kerberos.");
    return Fail(kKerberosUnsupported);
  }
  const Json::Value& upload = params["keytab_file_tmp"];
  if (!upload.isString()) {
    LOG_ERROR("file path 'keytab_file_tmp' is missing.");
    return Fail(kNoUpload);
  }
  const std::string path = upload.asString();
  const int error = ImportKeytab(path);
  // Every attempt consumes the upload: docs/decisions/0031.
  if (KLIBCFileExist(path.c_str()) != 0) static_cast<void>(unlink(path.c_str()));
  return error == kNoError || Fail(error);
}
