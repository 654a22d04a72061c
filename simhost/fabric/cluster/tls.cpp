// The library only turns bytes into other bytes here: sockets, and waiting for them, are the
// stream's. Servers have addresses, not names, so whom to trust is said by the CA certificate
// alone.
#include "fabric/cluster/tls.h"

#include <fmt/format.h>
#include <openssl/bio.h>
#include <openssl/err.h>
#include <openssl/ssl.h>
#include <openssl/x509.h>

#include <array>
#include <memory>
#include <utility>
#include <vector>

namespace simhost::fabric {
namespace {

using openvswitch::Disconnected;
using Bytes = std::vector<std::uint8_t>;

constexpr std::size_t kLargestRecord = SSL3_RT_MAX_PLAIN_LENGTH;

struct Deleter {
  void operator()(SSL_CTX *context) const { SSL_CTX_free(context); }
  void operator()(SSL *connection) const { SSL_free(connection); }
  void operator()(BIO *bytes) const { BIO_free(bytes); }
};
template <typename Object>
using Owned = std::unique_ptr<Object, Deleter>;

// The first of what went wrong in this thread; the rest follows from it.
unsigned long first_error() {
  auto const error = ERR_get_error();
  ERR_clear_error();
  return error;
}

std::string words_of(unsigned long error) {
  if (ERR_SYSTEM_ERROR(error)) {
    return openvswitch::error_words(ERR_GET_REASON(error));
  }
  auto const *const words = ERR_reason_error_string(error);
  return words == nullptr ? "it cannot be used" : words;
}

bool is_of_another_key(unsigned long error) {
  return ERR_GET_LIB(error) == ERR_LIB_X509 && ERR_GET_REASON(error) == X509_R_KEY_VALUES_MISMATCH;
}

// Whether that is what the other side complains of.
bool is_of_certificate(int alert) {
  return (alert >= SSL_AD_BAD_CERTIFICATE && alert <= SSL_AD_CERTIFICATE_UNKNOWN) ||
         alert == SSL_AD_UNKNOWN_CA || alert == SSL_AD_ACCESS_DENIED ||
         alert == TLS13_AD_CERTIFICATE_REQUIRED;
}

// Nobody is there to be asked for one.
int no_passphrase(char * /*to*/, int /*size*/, int /*is_writing*/, void * /*data*/) {
  return -1;
}

[[noreturn]] void fail_with(std::filesystem::path const &file, std::string const &why) {
  throw Disconnected(fmt::format("{}: {}", file.native(), why));
}

Owned<SSL_CTX> context_of(Credentials const &credentials) {
  ERR_clear_error();
  Owned<SSL_CTX> context(SSL_CTX_new(TLS_client_method()));
  if (!context) {
    throw Disconnected("no encryption: " + words_of(first_error()));
  }
  SSL_CTX_set_min_proto_version(context.get(), TLS1_2_VERSION);
  SSL_CTX_set_options(context.get(), SSL_OP_NO_RENEGOTIATION);
  SSL_CTX_set_default_passwd_cb(context.get(), no_passphrase);
  if (SSL_CTX_load_verify_file(context.get(), credentials.ca_certificate.c_str()) != 1) {
    fail_with(credentials.ca_certificate, words_of(first_error()));
  }
  if (SSL_CTX_use_certificate_chain_file(context.get(), credentials.certificate.c_str()) != 1) {
    fail_with(credentials.certificate, words_of(first_error()));
  }
  auto const is_taken =
      SSL_CTX_use_PrivateKey_file(context.get(), credentials.private_key.c_str(), SSL_FILETYPE_PEM);
  auto const error = first_error();
  // A key of another kind than the certificate's is taken, for a certificate to come.
  if (is_of_another_key(error) ||
      (is_taken == 1 && SSL_CTX_check_private_key(context.get()) != 1)) {
    fail_with(credentials.private_key,
              "it is not the key of the certificate " + credentials.certificate.native());
  }
  if (is_taken != 1) {
    fail_with(credentials.private_key, words_of(error));
  }
  return context;
}

template <typename Print>
std::string printed(Print const &print) {
  Owned<BIO> const text(BIO_new(BIO_s_mem()));
  print(text.get());
  char *begin = nullptr;
  auto const size = BIO_get_mem_data(text.get(), &begin);
  return {begin, static_cast<std::size_t>(size)};
}

// Without what a terminal would obey: it is somebody else's text.
std::string subject_of(X509 *certificate) {
  return printed([&](BIO *text) {
    X509_NAME_print_ex(text, X509_get_subject_name(certificate), 0, XN_FLAG_RFC2253);
  });
}

// An empty text of one that has not.
std::string expired(X509 const *certificate) {
  auto const *const until = X509_get0_notAfter(certificate);
  if (X509_cmp_current_time(until) >= 0) {
    return {};
  }
  return "; it expired on " + printed([&](BIO *text) { ASN1_TIME_print(text, until); });
}

class Tls : public openvswitch::Cipher {
 public:
  Tls(std::string server, Credentials credentials)
      : server_(std::move(server)),
        credentials_(std::move(credentials)),
        context_(context_of(credentials_)),
        connection_(SSL_new(context_.get())) {
    auto *const came = BIO_new(BIO_s_mem());
    auto *const to_send = BIO_new(BIO_s_mem());
    if (!connection_ || came == nullptr || to_send == nullptr) {
      throw std::bad_alloc();
    }
    SSL_set_bio(connection_.get(), came, to_send);
    SSL_set_app_data(connection_.get(), this);
    SSL_set_verify(connection_.get(), SSL_VERIFY_PEER, note_refused);
    SSL_set_connect_state(connection_.get());
  }

  [[nodiscard]] bool is_agreed() const override { return is_agreed_; }

  void encrypt(std::span<std::uint8_t const> plain, Bytes &to) override {
    ERR_clear_error();
    for (std::size_t count = 0; !plain.empty(); plain = plain.subspan(count)) {
      if (SSL_write_ex(connection_.get(), plain.data(), plain.size(), &count) != 1) {
        fail();
      }
    }
    take_sent(to);
  }

  void decrypt(std::span<std::uint8_t const> came, Bytes &to, Bytes &replies) override {
    ERR_clear_error();
    if (!came.empty()) {
      BIO_write(SSL_get_rbio(connection_.get()), came.data(), static_cast<int>(came.size()));
    }
    if (!is_agreed_) {
      agree();
    }
    if (is_agreed_) {
      read(to);
    }
    take_sent(replies);
  }

 private:
  static int note_refused(int is_trusted, X509_STORE_CTX *chain) {
    if (is_trusted == 0) {
      auto *const connection = static_cast<SSL *>(
          X509_STORE_CTX_get_ex_data(chain, SSL_get_ex_data_X509_STORE_CTX_idx()));
      static_cast<Tls *>(SSL_get_app_data(connection))->note(chain);
    }
    return is_trusted;
  }

  void note(X509_STORE_CTX *chain) {
    // The server's own, wherever in the chain the trouble is.
    auto *const certificate = X509_STORE_CTX_get0_cert(chain);
    refused_ = fmt::format("by {} its certificate '{}' is not to be trusted: {}",
                           credentials_.ca_certificate.native(),
                           certificate == nullptr ? std::string() : subject_of(certificate),
                           X509_verify_cert_error_string(X509_STORE_CTX_get_error(chain)));
  }

  void agree() {
    auto const result = SSL_do_handshake(connection_.get());
    if (result == 1) {
      is_agreed_ = true;
    } else if (SSL_get_error(connection_.get(), result) != SSL_ERROR_WANT_READ) {
      fail();
    }
  }

  void read(Bytes &to) {
    std::array<std::uint8_t, kLargestRecord> record{};
    std::size_t count = 0;
    int result = 0;
    while ((result = SSL_read_ex(connection_.get(), record.data(), record.size(), &count)) == 1) {
      to.insert(to.end(), record.begin(), record.begin() + static_cast<std::ptrdiff_t>(count));
    }
    if (SSL_get_error(connection_.get(), result) != SSL_ERROR_WANT_READ) {
      fail();
    }
  }

  void take_sent(Bytes &to) {
    char *begin = nullptr;
    auto *const sent = SSL_get_wbio(connection_.get());
    auto const size = BIO_get_mem_data(sent, &begin);
    to.insert(to.end(), begin, begin + size);
    BIO_reset(sent);
  }

  [[noreturn]] void fail() {
    auto const error = first_error();
    // The numbers of what the other side complains of follow those of what happens here.
    auto const complaint = ERR_GET_REASON(error) - SSL_AD_REASON_OFFSET;
    std::string why;
    if (!refused_.empty()) {
      why = refused_;
    } else if (error == 0) {
      why = "the other side closed the connection";
    } else if (ERR_GET_LIB(error) == ERR_LIB_SSL && complaint >= 0) {
      auto const *const words = SSL_alert_desc_string_long(complaint);
      why = is_of_certificate(complaint)
                ? fmt::format("it does not accept the certificate {}: {}{}",
                              credentials_.certificate.native(), words,
                              expired(SSL_get_certificate(connection_.get())))
                : fmt::format("it ends the agreement: {}", words);
    } else {
      why = words_of(error);
    }
    throw Disconnected(fmt::format("{}: {}", server_, why));
  }

  std::string server_;
  Credentials credentials_;
  Owned<SSL_CTX> context_;
  Owned<SSL> connection_;
  bool is_agreed_ = false;
  std::string refused_;  // why the other side's certificate is
};

}  // namespace

openvswitch::Stream encrypted_to(openvswitch::TcpAddress const &address,
                                 Credentials const &credentials, openvswitch::Deadline deadline) {
  constexpr auto *kProtocol = "ssl";
  auto const name = fmt::format("{}:{}", kProtocol, openvswitch::text_of(address));
  auto cipher = std::make_unique<Tls>(name, credentials);
  auto stream = openvswitch::connected_to(address, deadline, kProtocol);
  stream.encrypt(std::move(cipher), deadline);
  return stream;
}

}  // namespace simhost::fabric
