// "VORN.Core.FileServ.NFS.Kerberos": the service's keytab, and whether Kerberos is supported.
#ifndef VORN_KERBEROS_H
#define VORN_KERBEROS_H

#include "handler.h"

class NFSKerberosServiceHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The methods "get", "upload_key" and "list".
  void Get();
  void UploadKey();
  void List();

  // Each answers true, or false with an error code recorded and the reason logged.
  bool GetData(Json::Value& result);
  bool ListData(Json::Value& result);
  bool UploadKeyInternal(const Json::Value& params);
};

#endif  // VORN_KERBEROS_H
