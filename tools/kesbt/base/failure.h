#ifndef KESBT_BASE_FAILURE_H
#define KESBT_BASE_FAILURE_H

#include <stdexcept>
#include <string>

namespace Bluetooth {
class RemoteObject;
}

namespace Kesbt {

/// Why the program ends without success: one line that says what to do, and the exit status.
class Failure : public std::runtime_error {
public:
    explicit Failure(const std::string& line, int exitStatus = 1);
    int status() const { return m_status; }

private:
    int m_status;
};

/// Arguments that cannot be meant so (status 2).
Failure wrongUsage(const std::string& line);

/// The bus or the daemon is not there. Looks which of them is missing.
Failure daemonAbsent();
/// The daemon was there when the verb began.
Failure daemonLost();

/// What the daemon answered, with advice where there is any.
/// @param what what was not possible, e.g. "cannot start a discovery on hci0"
Failure refusal(const std::string& what, Bluetooth::RemoteObject& proxy);
Failure refusal(const std::string& what, const std::string& reason);

/// The adapter cannot go on.
Failure adapterRemoved(const std::string& adapter);
Failure adapterOff(const std::string& adapter);

/// A call went well, but what it should have changed has not changed within the time-out.
Failure notConfirmed(const std::string& what);

} // namespace Kesbt

#endif
