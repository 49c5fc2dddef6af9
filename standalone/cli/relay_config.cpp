// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/relay_config.h"

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <system_error>

#include "standalone/base/file.h"
#include "standalone/cli/certificate.h"
#include "standalone/cli/console.h"

namespace lookhaven::cli {

namespace {

namespace fs = std::filesystem;

std::string Location(const store::RecordingServer& server, const fs::path& certificate) {
    return Concat("location ~ \"^/relay/", server.id,
                  "/(?<relay_address>[^/]+)/(?<relay_port>[0-9]+)/[0-9]+$\" {\n"
                  "    internal;\n"
                  "    proxy_pass https://$relay_address:$relay_port/webapi$is_args$args;\n"
                  "    proxy_ssl_trusted_certificate \"",
                  certificate.string(), "\";\n    proxy_ssl_name ", CertificateName(server.certificate),
                  ";\n    error_page 401 403 500 502 504 =502 /error/no-server;\n}\n");
}

// An nginx that does not run reads the files when it starts. Its stale pid file may name another program by now.
void ReloadNginx(const fs::path& pid_file) {
    try {
        const int pid = std::stoi(base::ReadFile(pid_file));
        if (pid > 1 && base::ReadFile("/proc/" + std::to_string(pid) + "/comm") == "nginx\n") {
            ::kill(pid, SIGHUP);
        }
    } catch (const std::system_error&) {
    } catch (const std::logic_error&) {
    }
}

}  // namespace

void WriteRelayConfig(const base::Installation& installation, const std::vector<store::RecordingServer>& servers) {
    const fs::path folder = installation.TlsFolder() / "servers";
    fs::create_directories(folder);
    std::string config;
    for (const store::RecordingServer& server : servers) {
        const fs::path file = folder / (std::to_string(server.id) + ".pem");
        if (server.enabled && !server.address.empty()) {
            base::WriteFileAtomically(file, server.certificate);
            config += Location(server, file);
        }
    }
    base::WriteFileAtomically(installation.RunFolder() / "relay.conf", config);
    ReloadNginx(installation.RunFolder() / "nginx.pid");
}

}  // namespace lookhaven::cli
