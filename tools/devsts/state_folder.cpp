// SPDX-License-Identifier: Apache-2.0

#include "state_folder.h"

#include <openssl/bio.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <openssl/rsa.h>
#include <openssl/x509v3.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <string_view>
#include <vector>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

namespace DevSts {

namespace {

namespace fs = std::filesystem;

constexpr unsigned KEY_BITS = 2048;
constexpr long SECONDS_BEFORE = 3600; // clocks differ
constexpr long SECONDS_VALID = 10L * 365 * 24 * 3600;
constexpr const char *ORGANISATION = "corp.example";

struct Extension {
  int kind;
  const char *value;
};

/// What a certificate is used for.
struct Purpose {
  const char *file;
  const char *commonName;
  bool isSelfSigned;
  std::vector<Extension> extensions;
};

const Purpose AUTHORITY{"authority",
                        "Development authority",
                        true,
                        {{NID_basic_constraints, "critical,CA:TRUE"}, {NID_key_usage, "critical,keyCertSign,cRLSign"}}};
const Purpose TLS{"tls",
                  "localhost",
                  false,
                  {{NID_basic_constraints, "critical,CA:FALSE"},
                   {NID_key_usage, "critical,digitalSignature,keyEncipherment"},
                   {NID_ext_key_usage, "serverAuth"},
                   {NID_subject_alt_name, "DNS:localhost,IP:127.0.0.1,IP:::1"}}};
const std::vector<Extension> TOKEN_SIGNER{{NID_basic_constraints, "critical,CA:FALSE"},
                                          {NID_key_usage, "critical,digitalSignature"}};
const Purpose SIGNING{"signing", "Development token signer", false, TOKEN_SIGNER};
const Purpose FOREIGN{"foreign", "Foreign token signer", true, TOKEN_SIGNER};
const std::vector<Extension> CLIENT_USE{{NID_basic_constraints, "critical,CA:FALSE"},
                                        {NID_key_usage, "critical,digitalSignature"},
                                        {NID_ext_key_usage, "clientAuth"}};
const Purpose CLIENT{"client", "client", false, CLIENT_USE};
const Purpose OTHER_CLIENT{"other-client", "other-client", false, CLIENT_USE};

struct BioDeleter {
  void operator()(BIO *bio) const noexcept { BIO_free_all(bio); }
};
using Bio = std::unique_ptr<BIO, BioDeleter>;

[[noreturn]] void FailAt(const fs::path &path, const std::string &why) {
  throw std::runtime_error(path.string() + ": " + why);
}

[[noreturn]] void FailWithErrno(const fs::path &path) {
  FailAt(path, std::strerror(errno));
}

void RequireOpenSsl(bool success, const char *what) {
  if (!success) {
    throw std::runtime_error(std::string(what) + ": " + OpenSslErrors());
  }
}

/// Makes other services wait while this one creates what is missing.
class FolderLock {
public:
  explicit FolderLock(const fs::path &folder) : m_descriptor(open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC)) {
    if (m_descriptor < 0 || flock(m_descriptor, LOCK_EX) != 0) {
      const int error = errno;
      Close();
      errno = error;
      FailWithErrno(folder);
    }
  }
  FolderLock(const FolderLock &) = delete;
  FolderLock &operator=(const FolderLock &) = delete;
  ~FolderLock() { Close(); }

private:
  void Close() const noexcept {
    if (m_descriptor >= 0) {
      close(m_descriptor);
    }
  }
  int m_descriptor;
};

/// Writes the file whole or not at all.
void WriteFile(const fs::path &path, BIO &content, mode_t mode) {
  char *data = nullptr;
  const long size = BIO_get_mem_data(&content, &data);
  const fs::path unfinished = path.string() + ".new";
  unlink(unfinished.c_str()); // left by a start that was interrupted
  const int descriptor = open(unfinished.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, mode);
  if (descriptor < 0) {
    FailWithErrno(unfinished);
  }
  const bool written = write(descriptor, data, static_cast<std::size_t>(size)) == size;
  if (close(descriptor) != 0 || !written || rename(unfinished.c_str(), path.c_str()) != 0) {
    FailWithErrno(path);
  }
}

PrivateKey ReadKey(const fs::path &path) {
  const Bio file(BIO_new_file(path.c_str(), "r"));
  PrivateKey key(file ? PEM_read_bio_PrivateKey(file.get(), nullptr, nullptr, nullptr) : nullptr);
  if (!key) {
    FailAt(path, "not a private key: " + OpenSslErrors());
  }
  return key;
}

Certificate ReadCertificate(const fs::path &path) {
  const Bio file(BIO_new_file(path.c_str(), "r"));
  Certificate certificate(file ? PEM_read_bio_X509(file.get(), nullptr, nullptr, nullptr) : nullptr);
  if (!certificate) {
    FailAt(path, "not a certificate: " + OpenSslErrors());
  }
  return certificate;
}

void SetSerial(X509 &certificate) {
  std::array<unsigned char, 16> bytes{};
  RequireOpenSsl(RAND_bytes(bytes.data(), bytes.size()) == 1, "random bytes");
  bytes[0] = static_cast<unsigned char>((bytes[0] & 0x7Fu) | 0x40u); // positive and of full length
  const std::unique_ptr<BIGNUM, void (*)(BIGNUM *)> number(BN_bin2bn(bytes.data(), bytes.size(), nullptr), BN_free);
  RequireOpenSsl(number && BN_to_ASN1_INTEGER(number.get(), X509_get_serialNumber(&certificate)), "serial number");
}

void SetSubject(X509 &certificate, const char *commonName) {
  X509_NAME *const subject = X509_get_subject_name(&certificate);
  const auto add = [subject](const char *field, const char *value) {
    RequireOpenSsl(X509_NAME_add_entry_by_txt(subject, field, MBSTRING_UTF8,
                                              reinterpret_cast<const unsigned char *>(value), -1, -1, 0) == 1,
                   "certificate subject");
  };
  add("O", ORGANISATION);
  add("CN", commonName);
}

void AddExtensions(X509 &certificate, X509 &issuer, const std::vector<Extension> &extensions) {
  X509V3_CTX context{};
  X509V3_set_ctx(&context, &issuer, &certificate, nullptr, nullptr, 0);
  const auto add = [&](int kind, const char *value) {
    const std::unique_ptr<X509_EXTENSION, void (*)(X509_EXTENSION *)> extension(
        X509V3_EXT_conf_nid(nullptr, &context, kind, value), X509_EXTENSION_free);
    RequireOpenSsl(extension && X509_add_ext(&certificate, extension.get(), -1) == 1, "certificate extension");
  };
  for (const Extension &extension : extensions) {
    add(extension.kind, extension.value);
  }
  add(NID_subject_key_identifier, "hash");
  add(NID_authority_key_identifier, "keyid:always");
}

Certificate MakeCertificate(const Purpose &purpose, EVP_PKEY &key, X509 *issuer, EVP_PKEY &issuerKey) {
  Certificate certificate(X509_new());
  RequireOpenSsl(certificate && X509_set_version(certificate.get(), X509_VERSION_3) == 1, "certificate");
  SetSerial(*certificate);
  X509_gmtime_adj(X509_getm_notBefore(certificate.get()), -SECONDS_BEFORE);
  X509_gmtime_adj(X509_getm_notAfter(certificate.get()), SECONDS_VALID);
  SetSubject(*certificate, purpose.commonName);
  X509 &actualIssuer = issuer ? *issuer : *certificate;
  RequireOpenSsl(X509_set_issuer_name(certificate.get(), X509_get_subject_name(&actualIssuer)) == 1 &&
                     X509_set_pubkey(certificate.get(), &key) == 1,
                 "certificate");
  AddExtensions(*certificate, actualIssuer, purpose.extensions);
  RequireOpenSsl(X509_sign(certificate.get(), &issuerKey, EVP_sha256()) > 0, "signing a certificate");
  return certificate;
}

void MakeIdentity(const Purpose &purpose, const Identity &files, const Identity *authority) {
  const PrivateKey key(EVP_RSA_gen(KEY_BITS));
  RequireOpenSsl(key != nullptr, "making a key");
  const PrivateKey authorityKey = purpose.isSelfSigned ? nullptr : ReadKey(authority->keyFile);
  const Certificate certificate =
      MakeCertificate(purpose, *key, purpose.isSelfSigned ? nullptr : authority->certificate.get(),
                      purpose.isSelfSigned ? *key : *authorityKey);
  const Bio keyText(BIO_new(BIO_s_secmem()));
  const Bio certificateText(BIO_new(BIO_s_mem()));
  RequireOpenSsl(keyText && certificateText &&
                     PEM_write_bio_PrivateKey(keyText.get(), key.get(), nullptr, nullptr, 0, nullptr, nullptr) == 1 &&
                     PEM_write_bio_X509(certificateText.get(), certificate.get()) == 1,
                 "writing a key");
  WriteFile(files.keyFile, *keyText, S_IRUSR | S_IWUSR);
  WriteFile(files.certificateFile, *certificateText, S_IRUSR | S_IWUSR | S_IRGRP | S_IROTH);
}

Identity OpenIdentity(const fs::path &folder, const Purpose &purpose, const Identity *authority) {
  const fs::path base = folder / purpose.file;
  Identity identity{base.string() + ".key", base.string() + ".crt", nullptr};
  // The certificate is written last, so a key without a certificate is left over from an interrupted start.
  if (!fs::exists(identity.certificateFile)) {
    MakeIdentity(purpose, identity, authority);
  }
  identity.certificate = ReadCertificate(identity.certificateFile);
  // OpenSSL decodes the extensions at their first use. Do it now, before several connections use them at once.
  X509_check_purpose(identity.certificate.get(), -1, 0);
  const PrivateKey key = ReadKey(identity.keyFile);
  if (X509_check_private_key(identity.certificate.get(), key.get()) != 1) {
    FailAt(identity.certificateFile, "does not match the key in the same folder");
  }
  if (!purpose.isSelfSigned &&
      X509_verify(identity.certificate.get(), X509_get0_pubkey(authority->certificate.get())) != 1) {
    FailAt(identity.certificateFile, "was issued by another authority; remove the state folder to have it made anew");
  }
  if (X509_cmp_current_time(X509_get0_notAfter(identity.certificate.get())) <= 0) {
    FailAt(identity.certificateFile, "has expired; remove the state folder to have it made anew");
  }
  return identity;
}

} // namespace

StateFolder OpenStateFolder(const fs::path &path) {
  StateFolder folder;
  folder.path = fs::absolute(path).lexically_normal();
  if (mkdir(folder.path.c_str(), S_IRWXU) != 0 && errno != EEXIST) {
    FailWithErrno(folder.path);
  }
  const FolderLock lock(folder.path);
  folder.authority = OpenIdentity(folder.path, AUTHORITY, nullptr);
  folder.tls = OpenIdentity(folder.path, TLS, &folder.authority);
  folder.signing = OpenIdentity(folder.path, SIGNING, &folder.authority);
  folder.foreign = OpenIdentity(folder.path, FOREIGN, nullptr);
  folder.client = OpenIdentity(folder.path, CLIENT, &folder.authority);
  folder.otherClient = OpenIdentity(folder.path, OTHER_CLIENT, &folder.authority);
  return folder;
}

} // namespace DevSts
