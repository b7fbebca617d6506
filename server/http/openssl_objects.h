// Owners of OpenSSL's objects.
#ifndef VORN_SERVER_OPENSSL_OBJECTS_H
#define VORN_SERVER_OPENSSL_OBJECTS_H

#include <openssl/bio.h>
#include <openssl/evp.h>
#include <openssl/x509.h>

#include <memory>

namespace vorn::server {

template <auto kFree>
struct FreeWith {
  template <typename T>
  void operator()(T* object) const {
    kFree(object);
  }
};

using Bio = std::unique_ptr<BIO, FreeWith<BIO_free>>;
using Certificate = std::unique_ptr<X509, FreeWith<X509_free>>;
using Extension = std::unique_ptr<X509_EXTENSION, FreeWith<X509_EXTENSION_free>>;
using Key = std::unique_ptr<EVP_PKEY, FreeWith<EVP_PKEY_free>>;
using Number = std::unique_ptr<BIGNUM, FreeWith<BN_free>>;

}  // namespace vorn::server

#endif  // VORN_SERVER_OPENSSL_OBJECTS_H
