// The API "VORN.Core.FileServ.NFS.Kerberos": the keytab of the NFS service, and whether the platform supports
// Kerberos for NFS (RFC 4120; RPCSEC_GSS, RFC 2203).
#ifndef VORN_KERBEROS_H
#define VORN_KERBEROS_H

#include "handler.h"

// Serves one request. Not thread-safe; each request has its own object. See ServiceHandler for ownership.
class NFSKerberosServiceHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The drivers of the methods "get", "upload_key" and "list". Each answers the request exactly once.
  void Get();
  void UploadKey();
  void List();

  // The data functions return true on success. On failure they log the reason, record an error code and
  // return false.

  // Sets "kerberos_support" and "kerberos_principal". The principal is empty if no keytab is installed.
  // Error: 2302.
  bool GetData(Json::Value& result);

  // Sets "keytab", the array of the installed keys in file order. Error: 2302.
  bool ListData(Json::Value& result);

  // Installs the file named by "keytab_file_tmp" as the keytab and makes an enabled service reload it. Deletes
  // the file after every attempt to import it (docs/decisions/0031). A failed reload leaves the new keytab
  // installed. Errors: 2302, 2330, 2331, 2332.
  bool UploadKeyInternal(const Json::Value& params);
};

#endif  // VORN_KERBEROS_H
