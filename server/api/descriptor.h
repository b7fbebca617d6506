// The descriptor of a module: X.json describes X.so. It is a fragment of an OpenAPI 3.1
// document. The server reads from it
//
//   - "paths": a path item for each method, under the path that the method is called at, for example
//         "/api/VORN.Core.FileServ.NFS/v1/get": {"post": {"summary": "...", "x-read-only": true}}
//     "x-read-only" (default false) declares that the method changes nothing. A request body with a content of
//     type "multipart/form-data" declares that the method takes a file. The schemas of the request body and of the
//     answer 200 use the keywords of schema.h; that of the answer describes "data" only, because the server adds the
//     envelope. "x-error-codes" lists the codes that the method answers, each with "when" and, if it has details, their
//     schema: {"2351": {"when": "...", "details": {...}}}
//     "x-shown-by" names the reading method that shows what a changing method changes, and the parameters that must be
//     the same in both:
//         "x-shown-by": {"method": "VORN.Core.FileServ.NFS.SharePrivilege/v1/load", "same": ["share_name"]}
//     "x-share-parameter" names the parameter with the shared folder that the method is about. A token for some shares
//     can call only such methods.
//   - "x-error-codes": {"2301": {"status": 400, "text": "..."}}, the HTTP status of an error code and the text
//     that an administrator reads. "parameters": true declares that the code is about the parameters: the server then
//     adds what the schema of the request says about them. "causes" and "remedy" are for the documentation.
//   - "components": {"schemas": {...}}, the named schemas, and "tags", as in OpenAPI.
#ifndef VORN_SERVER_DESCRIPTOR_H
#define VORN_SERVER_DESCRIPTOR_H

#include <json/value.h>

#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "schema.h"

namespace vorn::server {

// Immutable after Parse(), so any thread may read it.
class Descriptor {
 public:
  struct ErrorCode {
    int status;
    std::string text;
    bool about_parameters = false;
  };

  // Returns the description of a method. A method without a description may write and takes no file.
  struct Method {
    bool reads_only = false;
    bool takes_file = false;
    std::string shown_by;           // "Api/v1/method"; empty if no method shows what this one changes
    std::vector<std::string> same;  // names of parameters
    std::string share_parameter{};  // empty: it is not about one shared folder
  };

  // An empty descriptor: every error code has status 500 and a general text, no method is described.
  Descriptor() = default;

  // Returns std::nullopt if `json` is not such a document; `error` then has the reason.
  static std::optional<Descriptor> Parse(std::string_view json, std::string* error);

  ErrorCode Describe(int code) const;

  // `path` is the path that the method is called at: "/api/{api}/v{version}/{method}".
  Method MethodAt(const std::string& path) const;

  // Returns the paths of all described methods.
  std::vector<std::string> Paths() const;

  // Returns what the schema of the method at `path` says against these parameters, see Schemas::Faults(). An empty list
  // if there is no such schema.
  std::vector<std::string> ParameterFaults(const std::string& path, const Json::Value& parameters) const;

  // Returns the names of the parameters whose values no log may have: those that the schema of the method declares as
  // "writeOnly", such as a password, and those that it does not know, which can be anything.
  std::vector<std::string> Unlogged(const std::string& path, const Json::Value& parameters) const;

  // The whole document; null for an empty descriptor.
  const Json::Value& document() const { return document_; }

 private:
  // The schema of the parameters as JSON, not a reference to it; nullptr if there is none.
  const Json::Value* ParameterSchema(const std::string& path) const;

  bool ReadErrorCodes(const Json::Value& codes, std::string* error);
  bool ReadPaths(const Json::Value& paths, std::string* error);
  bool ReadSchemas(const Json::Value& schemas, std::string* error);
  bool CheckContent(const Json::Value* content, std::string* error) const;
  bool CheckCodes(const Json::Value& codes, std::string* error) const;

  Json::Value document_;
  Schemas schemas_;
  std::map<int, ErrorCode> codes_;
  std::map<std::string, Method> methods_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_DESCRIPTOR_H
