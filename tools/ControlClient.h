#pragma once
// The client side of tolkatouchd's control socket: one JSON request line out, one JSON reply line
// back. Used by `tolkatouch prop` and `tolkatouch devices`.

#include <string>

#include <nlohmann/json.hpp>

namespace CLI {
class App;
}

namespace TolkaTouch::Tools {

// Where the daemon listens: $RUNTIME_DIRECTORY/tolkatouchd.sock when that is set (as it is for
// the service), /run/tolkatouch/tolkatouchd.sock otherwise.
std::string defaultControlSocketPath();

// A connected stream socket to the daemon (the caller closes it). Throws ToolError naming the
// socket when the daemon cannot be reached.
int connectControlSocket(const std::string& socketPath);

// Sends the request and answers the daemon's reply. Throws ToolError naming the socket when the
// daemon cannot be reached or gives no reply within `timeoutSeconds`, and naming `subject` when
// the reply is an error.
nlohmann::json controlRequest(const std::string& socketPath, const nlohmann::json& request,
                              const std::string& subject, double timeoutSeconds = 10.0);

}  // namespace TolkaTouch::Tools
