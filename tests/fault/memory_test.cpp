// SPDX-License-Identifier: LGPL-2.1-or-later
// Memory runs out: each allocation of an operation is made to fail in turn, in the library, in
// libdbus and in the C++ library. The operation then reports an error or throws std::bad_alloc,
// works the next time, and has leaked nothing.

#include "core/bus_link.h"
#include "core/process.h"
#include "host/auto_connect_file.h"
#include "support/namespace_test.h"
#include "support/peer_test.h"
#include "support/simulation.h"

#include <bluetooth/adapter.h>
#include <bluetooth/adapter_list.h>
#include <bluetooth/agent.h>
#include <bluetooth/dbus_object.h>
#include <bluetooth/device_list.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>

#include <fcntl.h>
#include <sys/wait.h>

#include <atomic>
#include <cerrno>
#include <fstream>
#include <functional>
#include <memory>
#include <utility>

// The library's failures are logged by the thousand here; recording them would take memory.
extern "C" void syslog(int /*priority*/, const char* /*format*/, ...) {}

namespace {

/// Which allocation of this thread fails, from 1; 0: none does; below: one has. The malloc()
/// here takes the place of the C library's, for libdbus and the C++ library too.
thread_local int untilFailure = 0;
std::atomic<long> liveBlocks{0}; // how many the process holds

} // namespace

#if !defined(__SANITIZE_ADDRESS__) &&                                                              \
    !defined(__SANITIZE_THREAD__) // they have a malloc of their own

namespace {

bool mayAllocate() {
    if (untilFailure <= 0 || --untilFailure > 0)
        return true;
    untilFailure = -1;
    errno = ENOMEM;
    return false;
}

void* counted(void* block) {
    if (block)
        ++liveBlocks;
    return block;
}

} // namespace

#define KES_REPLACES_LIBC __attribute__((visibility("default")))

extern "C" {

// NOLINTBEGIN(bugprone-reserved-identifier,cert-dcl37-c,cert-dcl51-cpp): the C library's names
void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t count, std::size_t size);
void* __libc_realloc(void* block, std::size_t size);
void __libc_free(void* block);
// NOLINTEND(bugprone-reserved-identifier,cert-dcl37-c,cert-dcl51-cpp)

KES_REPLACES_LIBC void* malloc(std::size_t size) {
    return mayAllocate() ? counted(__libc_malloc(size)) : nullptr;
}

KES_REPLACES_LIBC void* calloc(std::size_t nmemb, std::size_t size) {
    return mayAllocate() ? counted(__libc_calloc(nmemb, size)) : nullptr;
}

KES_REPLACES_LIBC void* realloc(void* ptr, std::size_t size) {
    if (!mayAllocate())
        return nullptr;
    void* moved = __libc_realloc(ptr, size);
    return ptr ? moved : counted(moved);
}

KES_REPLACES_LIBC void free(void* ptr) {
    if (ptr)
        --liveBlocks;
    __libc_free(ptr);
}
}

#endif

namespace Bluetooth::Test {

namespace {

using Operation = std::function<bool()>;

void onDict(RemoteObject*, const char*, const Dict* dict) {
    dictConquerToString(*dict, ";");
}

void appendProperties(Writer& w) {
    w.dict("sv", [](Writer& d) {
        d.entry("Name", Var{"a name that does not fit into the string itself"});
        d.entry("Class", Var{360u});
        d.entryWith("UUIDs", [](Writer& v) {
            v.variant("as", [](Writer& x) { x.array("s", [](Writer& a) { a("110a")("1112"); }); });
        });
    });
}

/// Lets each allocation fail once. @return how many there are
int failEachAllocation(const char* name, const Operation& operation) {
    for (int which = 1;; ++which) {
        bool succeeded = false;
        untilFailure = which;
        try {
            succeeded = operation();
        } catch (const std::bad_alloc&) {
        }
        const bool failed = std::exchange(untilFailure, 0) < 0; // were so many made?
        EXPECT_TRUE(failed || succeeded) << name;
        EXPECT_TRUE(operation()) << name << " after allocation " << which << " had failed";
        if (!failed || ::testing::Test::HasFailure())
            return which - 1;
    }
}

void checkEachAllocation(const char* name, const Operation& operation) {
    constexpr int rounds = 10;
    constexpr long messageCache = 5; // libdbus keeps as many messages for the next ones
    ASSERT_TRUE(operation()) << name;
    EXPECT_GT(failEachAllocation(name, operation), 0) << name;
    const long before = liveBlocks;
    for (int round = 0; round < rounds && !::testing::Test::HasFailure(); ++round)
        failEachAllocation(name, operation);
    EXPECT_LE(liveBlocks - before, messageCache) << name;
}

} // namespace

class MemoryTest : public ::testing::Test {
protected:
    void SetUp() override {
        if (isSanitized)
            GTEST_SKIP() << "sanitizers have an allocator of their own";
        // libdbus looks up both addresses when the first bus is asked for.
        PrivateBus::address(PrivateBus::Kind::System);
        PrivateBus::address(PrivateBus::Kind::Session);
    }
};

TEST_F(MemoryTest, CallsAndSubscriptionsSurviveEachFailedAllocation) {
    const PrivateBus bus(PrivateBus::Kind::Session);
    checkEachAllocation("the link of a new connection", [&] {
        const int which = std::exchange(untilFailure, 0); // opening it is libdbus's affair
        const auto close = [](DBusConnection* connection) {
            dbus_connection_close(connection);
            dbus_connection_unref(connection);
        };
        const std::unique_ptr<DBusConnection, decltype(close)> connection(
            dbus_connection_open_private(bus.address().c_str(), nullptr), close);
        untilFailure = which;
        return BusLink::of(connection.get()) != nullptr;
    });
    const auto busProxy = [](const char* path) {
        return std::make_unique<RemoteObject>(DBUS_SERVICE_DBUS, path, DBUS_INTERFACE_DBUS,
                                              DBUS_BUS_SESSION);
    };
    checkEachAllocation("a call", [&] {
        std::string id;
        const auto proxy = busProxy("/");
        return proxy->newMessage("GetId") == 0 && proxy->sendMessage(true, -1) == 0 &&
               proxy->getReplyValue(id) == 0 && !id.empty();
    });
    checkEachAllocation("a call without a reply", [&] {
        const auto proxy = busProxy("/");
        return proxy->newMessage("Hello") == 0 && proxy->append("text") == 0 &&
               proxy->append(ObjectPath("/path")) == 0 &&
               proxy->append(Variant(std::string("value"))) == 0 &&
               proxy->sendMessage(false, -1) == 0;
    });
    checkEachAllocation("a subscription", [&] {
        const auto proxy = busProxy("/subscription");
        return proxy->setSignalHandlerStringDict("Changed", onDict) == 0;
    });
    const auto subscriber = busProxy("/");
    ASSERT_EQ(subscriber->setSignalHandlerStringDict("Changed", onDict), 0);
    const MessagePtr signal(dbus_message_new_signal("/", DBUS_INTERFACE_DBUS, "Changed"));
    appendProperties(Writer(signal.get())("00:11:22:33:44:55"));
    checkEachAllocation("a signal", [&] {
        subscriber->signalHandlerDispatcherStringDict(signal.get());
        return true;
    });
}

TEST_F(MemoryTest, TheDaemonsProxiesSurviveEachFailedAllocation) {
    Simulation simulation;
    checkEachAllocation("whether the daemon is there", [] { return BluezObject::hasBluetoothd(); });
    checkEachAllocation("the adapters and their devices", [] {
        const std::unique_ptr<Manager> manager(Manager::getManager());
        const std::unique_ptr<AdapterList> adapters(manager ? manager->listAdapters() : nullptr);
        if (!adapters || adapters->empty() || !adapters->front())
            return false;
        const std::unique_ptr<DeviceList> devices(adapters->front()->listDevices());
        return devices && !devices->empty() && devices->front();
    });
    checkEachAllocation("properties", [] {
        BluezObject manager("/", "org.bluez.Manager");
        const std::unique_ptr<Dict> properties(manager.getProperties());
        return properties && !properties->empty() && dictToString(*properties).size() > 10;
    });
}

TEST_F(MemoryTest, DecodingAndTextSurviveEachFailedAllocation) {
    const PrivateBus bus(PrivateBus::Kind::Session);
    RemoteObject proxy(peerName, peerPath, peerInterface, DBUS_BUS_SESSION);
    const MessagePtr reply(dbus_message_new(DBUS_MESSAGE_TYPE_METHOD_RETURN));
    const Writer arguments(reply.get(), appendProperties);
    checkEachAllocation("a dictionary and its text", [&] {
        Dict dict;
        proxy.setReplyMessage(dbus_message_ref(reply.get()));
        if (proxy.getReplyValue(dict) != 0)
            return false;
        const std::unique_ptr<Dict> again(stringDivideToDict(dictConquerToString(dict, ";"), ";"));
        return again && again->size() == 3 && find(again.get(), "Class") == "360";
    });

    Agent agent;
    const MessagePtr request(
        dbus_message_new_method_call(nullptr, "/agent", "org.bluez.Agent", "RequestPinCode"));
    dbus_message_set_serial(request.get(), 1);
    Writer(request.get())(Path{"/device"});
    checkEachAllocation("an answer of the agent", [&] {
        return Agent::handlerDispatcher(nullptr, request.get(), &agent) ==
               DBUS_HANDLER_RESULT_HANDLED;
    });

    // A list that is cut short would be written back so, and its rest be lost.
    const std::string path = testFolder() + "/auto-connect";
    const std::vector<std::string> entries(40,
                                           "an address longer than strings hold without memory");
    std::string content = "1";
    for (const std::string& entry : entries)
        content += "," + entry;
    std::ofstream(path) << content;
    checkEachAllocation("an auto-connect file", [&] {
        const AutoConnectFile file(path, O_RDONLY);
        if (!file.isOpen() || !file.readsEnabled())
            return false;
        const std::size_t count = file.entries().size();
        EXPECT_EQ(count, entries.size());
        return true;
    });
}

TEST_F(MemoryTest, AProgramIsStartedOrNothingOfItIsLeftBehind) {
    const Texts arguments{"-a", "-b"};
    const auto before = countOpenDescriptors();
    checkEachAllocation("a program", [&] {
        ProcessReader::open("/bin/true", arguments, patience);
        return true;
    });
    EXPECT_EQ(countOpenDescriptors(), before);
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "no process is left";
}

} // namespace Bluetooth::Test
