// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/server_object.h>

#include <bluetooth/scanner_server.h>

#include "core/log.h"
#include "scanner/dbus_glib.h"

#include <iostream>

namespace Bluetooth {

namespace {

constexpr guint timerInterval = 1000; // ms

const char* textOf(const char* text) {
    return text ? text : "";
}

/// libdbus ends the process on an argument that is not UTF-8, and on an invalid path. A name that
/// is invalid otherwise is for the bus to refuse.
bool areUsable(const char* busName, const char* path) {
    return busName && path && dbus_validate_utf8(busName, nullptr) &&
           dbus_validate_utf8(path, nullptr) && dbus_validate_path(path, nullptr);
}

/// Whether something else than the object is served at a path. dbus-glib ends the process on a
/// second one.
bool isTaken(const DBusGlib& glib, DBusGConnection* connection, const char* path,
             const GObject* object) {
    void* served = nullptr;
    return glib.lookUpObject(connection, path) != object &&
           dbus_connection_get_object_path_data(glib.getConnection(connection), path, &served) &&
           served;
}

/// Calls updateTimer() on the default main context, at most as long as this lives.
class LoopTimer {
public:
    explicit LoopTimer(ServerObject* object) : m_source(g_timeout_source_new(timerInterval)) {
        g_source_set_callback(m_source, updateTimer, object, nullptr);
        g_source_attach(m_source, nullptr);
    }
    ~LoopTimer() {
        g_source_destroy(m_source);
        g_source_unref(m_source);
    }
    LoopTimer(const LoopTimer&) = delete;
    LoopTimer& operator=(const LoopTimer&) = delete;

private:
    GSource* m_source;
};

} // namespace

ServerObject::ServerObject(const char* busName, const char* path, DBusBusType type)
    : m_busType(type), m_busName(busName), m_path(path) {
    getConnection();
    if (m_connection)
        m_busProxy = DBusGlib::load()->makeProxy(m_connection, DBUS_SERVICE_DBUS, DBUS_PATH_DBUS,
                                                 DBUS_INTERFACE_DBUS);
}

ServerObject::~ServerObject() {
    if (m_busProxy)
        g_object_unref(m_busProxy);
}

void ServerObject::getConnection() {
    const DBusGlib* glib = DBusGlib::load();
    if (m_connection || !glib)
        return;
    m_connection = glib->busGet(m_busType, nullptr);
    if (m_connection)
        dbus_connection_set_exit_on_disconnect(glib->getConnection(m_connection), false);
}

bool ServerObject::prepareObjectInfo(GType type, const DBusGObjectInfo* info, GObject* object) {
    if (!areUsable(m_busName, m_path)) {
        logError(KES_HERE, "Failed to acquire %s, %s", m_busName ? m_busName : "(null)",
                 "Invalid name or path");
        return false;
    }
    const DBusGlib* glib = DBusGlib::load();
    if (glib)
        glib->installInfo(type, info);

    constexpr guint noFlags = 0;
    guint result = 0; // whether the name is owned, or waited for, makes no difference here
    GError* error = nullptr;
    const char* const problem = glib ? "Not connected to the bus" : "dbus-glib is missing";
    if (!glib || !m_busProxy ||
        !glib->call(m_busProxy, "RequestName", &error, G_TYPE_STRING, m_busName, G_TYPE_UINT,
                    noFlags, G_TYPE_INVALID, G_TYPE_UINT, &result, G_TYPE_INVALID)) {
        logError(KES_HERE, "Failed to acquire %s, %s", m_busName, error ? error->message : problem);
        g_clear_error(&error);
        return false;
    }

    if (isTaken(*glib, m_connection, m_path, object)) {
        logError(KES_HERE, "Failed to serve %s, another object is there", m_path);
        return false;
    }
    glib->registerObject(m_connection, m_path, object);
    return true;
}

/// @return false when a loop is set already
bool ServerObject::setLoop(const std::shared_ptr<GMainLoop>& loop) {
    const std::lock_guard<std::mutex> lock(m_loopMutex);
    if (m_loop)
        return false;
    m_loop = loop;
    return true;
}

void ServerObject::startLoop() {
    // The frame runs a loop for the scanner service only: it is the one that has a manager.
    auto* scanner = dynamic_cast<ScannerServer*>(this);
    if (!scanner)
        return;
    std::shared_ptr<GMainLoop> loop(g_main_loop_new(nullptr, false), g_main_loop_unref);
    if (!setLoop(loop))
        return;

    scanner->startReceiving();
    if (const DBusGlib* glib = DBusGlib::load())
        glib->initThreads();
    {
        const LoopTimer timer(this);
        g_main_loop_run(loop.get());
    }
    {
        const std::lock_guard<std::mutex> lock(m_loopMutex);
        m_loop = nullptr; // `loop` holds it still: it is not destroyed under the lock
    }
    scanner->stopReceiving();
}

void ServerObject::quitLoop() {
    std::shared_ptr<GMainLoop> loop;
    {
        const std::lock_guard<std::mutex> lock(m_loopMutex);
        loop = m_loop;
    }
    if (loop)
        g_main_loop_quit(loop.get());
}

void ServerObject::printInfo() const {
    std::cout << "ServerObject name: " << getBusName() << std::endl;
    std::cout << "Path: " << getPath() << std::endl;
    std::cout << "Interface: " << getInterface() << std::endl;
}

const char* ServerObject::getConnectionName() const {
    return m_connection
               ? textOf(dbus_bus_get_unique_name(DBusGlib::load()->getConnection(m_connection)))
               : "";
}

// These tell about the bus, not about what is served: programs know them so.

const char* ServerObject::getBusName() const {
    return m_busProxy ? textOf(DBusGlib::load()->getBusName(m_busProxy)) : "";
}

const char* ServerObject::getPath() const {
    return m_busProxy ? textOf(DBusGlib::load()->getPath(m_busProxy)) : "";
}

const char* ServerObject::getInterface() const {
    return m_busProxy ? textOf(DBusGlib::load()->getInterface(m_busProxy)) : "";
}

int ServerObject::callbackThreadHandler(void*) {
    return 1;
}

int updateTimer(void* data) {
    return static_cast<ServerObject*>(data)->callbackThreadHandler(data);
}

} // namespace Bluetooth
