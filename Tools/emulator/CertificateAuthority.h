// A throw-away certificate authority for the emulator's HTTPS listener and for tests that talk to it.
#pragma once

#include <string>
#include <vector>

namespace emu {

// Paths of the PEM files written by makeTlsFiles.
struct TlsFiles {
    std::string caCertPath;  // the CA certificate a client trusts
    std::string certPath;    // the server certificate, signed by the CA
    std::string keyPath;     // the server's private key (mode 0600)
};

// Makes a fresh ECDSA P-256 CA (self-signed, CA:TRUE, keyCertSign) and a server certificate for
// `hostNames` (DNS subject alternative names, plus IP 127.0.0.1, extended key usage serverAuth)
// signed by it, and writes "ca.pem", "server.pem" and "server-key.pem" into `dir`, which must
// exist. Existing files of these names are replaced. The CA's private key is never written: once
// this returns, nobody can sign another certificate under this CA.
// Returns false and sets `error` on failure. Thread safety: may be called from any thread.
bool makeTlsFiles(const std::string& dir, const std::vector<std::string>& hostNames, TlsFiles& out,
                  std::string& error);

}  // namespace emu
