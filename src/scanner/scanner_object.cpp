// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/scanner_object.h>

#include <bluetooth/adapter.h>

#include "scanner/finders.h"
#include "scanner/scanner_object_info.h"

#include <new>

namespace Bluetooth {

#include "scanner_object_glue.h" // generated: the method table and its marshallers

namespace {

constexpr GQuark errorDomain = 3; // clients see it in the error's name
constexpr gint errorCode = 0;

gpointer parentClass = nullptr;

void finalize(GObject* object) {
    using FinderMap = decltype(ScannerObject::finders);
    reinterpret_cast<ScannerObject*>(object)->finders.~FinderMap();
    G_OBJECT_CLASS(parentClass)->finalize(object);
}

void initClass(gpointer type, gpointer) {
    parentClass = g_type_class_peek_parent(type);
    G_OBJECT_CLASS(type)->finalize = finalize;
}

void initInstance(GTypeInstance* instance, gpointer) {
    auto* object = reinterpret_cast<ScannerObject*>(instance);
    new (&object->finders) decltype(object->finders);
}

/// As much of a client's text as is told back to it.
std::string beginningOf(const char* adapterId) {
    std::string text = adapterId ? adapterId : "(null)";
    std::size_t end = Finders::longestAdapterId;
    if (text.size() <= end)
        return text;
    while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xc0) == 0x80)
        --end; // not inside a character: libdbus ends the process on invalid UTF-8
    return text.substr(0, end);
}

gboolean notFound(GError** error, const char* what, const char* adapterId) {
    g_set_error(error, errorDomain, errorCode, "%s %s not found", what,
                beginningOf(adapterId).c_str());
    return FALSE;
}

} // namespace

GType scanner_object_get_type() {
    static gsize type = 0;
    if (g_once_init_enter(&type)) {
        const GType registered = g_type_register_static_simple(
            G_TYPE_OBJECT, "ScannerObject", sizeof(GObjectClass), initClass, sizeof(ScannerObject),
            initInstance, GTypeFlags{});
        g_once_init_leave(&type, registered);
    }
    return type;
}

const DBusGObjectInfo& scannerObjectInfo() {
    return dbus_glib_scanner_object_object_info;
}

AddressSet* ScannerObject::addFinder(const char* adapterId) {
    Finders* current = currentFinders();
    return current && adapterId ? current->add(*this, adapterId).get() : nullptr;
}

// NOLINTNEXTLINE(performance-unnecessary-value-param): callers were built with it
AddressSet* ScannerObject::getListByName(std::string path) {
    Finders* current = currentFinders();
    return current ? current->of(*this, path).get() : nullptr;
}

gboolean scanner_object_list_devices(ScannerObject* object, const char* adapterId,
                                     GHashTable** devices, GError** error) try {
    if (!object)
        return notFound(error, "Object", adapterId);
    Finders* current = currentFinders();
    if (!current)
        return notFound(error, "Server", adapterId);
    const std::unique_ptr<Adapter> adapter = current->findAdapter(adapterId);
    if (!adapter)
        return notFound(error, "Adapter", adapterId);
    const Finders::Set set = current->of(*object, adapter->getPath());
    if (!set)
        return notFound(error, "Set", adapterId);
    current->awaitAnswersWritten();

    // dbus-glib unrefs the table and leaves its texts to it.
    std::unique_ptr<GHashTable, decltype(&g_hash_table_unref)> table(
        g_hash_table_new_full(g_str_hash, g_str_equal, g_free, g_free), g_hash_table_unref);
    const auto insert = [&table](const std::string& address, const std::string& text) {
        g_hash_table_insert(table.get(), g_strdup(address.c_str()), g_strdup(text.c_str()));
    };
    current->showUnknownDevices(*set, insert);
    if (g_hash_table_size(table.get()) == 0) // clients know an answer by its never being empty
        insert("", "");
    *devices = table.release();
    return TRUE;
} catch (const std::bad_alloc&) { // not through the frames of C that called
    return notFound(error, "Set", adapterId);
}

gboolean scanner_object_remove_finder(ScannerObject* object, const char* adapterId,
                                      GError** error) try {
    if (!object || !adapterId) {
        g_set_error_literal(error, errorDomain, errorCode, "Scanner or AdapterId is null");
        return FALSE;
    }
    Finders* current = currentFinders();
    const std::unique_ptr<Adapter> adapter = current ? current->findAdapter(adapterId) : nullptr;
    if (!adapter)
        return FALSE; // on purpose without an error: clients remove finders of adapters long gone
    current->remove(*object, *adapter);
    return TRUE;
} catch (const std::bad_alloc&) {
    return notFound(error, "Set", adapterId);
}

} // namespace Bluetooth
