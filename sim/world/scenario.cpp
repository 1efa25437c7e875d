// SPDX-License-Identifier: LGPL-2.1-or-later
#include "world/scenario.h"

#include "serving.h"
#include "serving/bluez4/address.h"
#include "serving/bus/glib_ptr.h"
#include "world/settings.h"

#include <stdexcept>

namespace Bluetooth::Sim {

namespace {

/// Reads one key file into a world; errors name where they were found.
class ScenarioReader {
public:
    ScenarioReader(std::string file, GKeyFile* keys) : m_file(std::move(file)), m_keys(keys) {}

    World read() {
        const GlibPtr<char*> groups(g_key_file_get_groups(m_keys, nullptr));
        for (char** group = groups.get(); *group; ++group)
            readGroup(*group);
        for (const auto& peer : m_world.peers) {
            if (!peer->adapter.empty() && !m_world.adapter(peer->adapter))
                fail("Device " + peer->address, "Adapter",
                     "there is no adapter \"" + peer->adapter + "\"");
            for (const auto& adapter : m_world.adapters)
                World::store(*adapter, *peer);
        }
        return std::move(m_world);
    }

private:
    [[noreturn]] void fail(const std::string& group, const std::string& key,
                           const std::string& what) const {
        throw std::runtime_error(m_file + ": [" + group + "]" +
                                 (key.empty() ? std::string() : " " + key) + ": " + what);
    }

    Settings settingsOf(const std::string& group) const {
        Settings settings;
        const GlibPtr<char*> names(g_key_file_get_keys(m_keys, group.c_str(), nullptr, nullptr));
        for (char** name = names.get(); *name; ++name) {
            ErrorOut error;
            const GlibPtr<char> value(
                g_key_file_get_string(m_keys, group.c_str(), *name, error.out()));
            if (error)
                fail(group, *name, error->message);
            settings.emplace_back(*name, value.get());
        }
        return settings;
    }

    template <class T>
    void apply(T& target, const std::string& group) const {
        try {
            applySettings(target, settingsOf(group));
        } catch (const SettingError& wrong) {
            fail(group, wrong.key(), wrong.what());
        }
    }

    void readGroup(const std::string& group) {
        if (group == "Times")
            apply(m_world.times, group);
        else if (group == "Audio")
            apply(m_world.audio, group);
        else if (group.compare(0, 8, "Adapter ") == 0)
            readAdapter(group, group.substr(8));
        else if (group.compare(0, 7, "Device ") == 0)
            readDevice(group, upperCase(group.substr(7)));
        else
            fail(group, "", "is neither [Times], [Audio], [Adapter hciN] nor [Device ADDRESS]");
    }

    void readAdapter(const std::string& group, const std::string& id) {
        guint64 index = 0;
        if (id.compare(0, 3, "hci") != 0 ||
            !g_ascii_string_to_unsigned(id.c_str() + 3, 10, 0, 99, &index, nullptr))
            fail(group, "", "an adapter is named hci0 to hci99");
        auto adapter = std::make_shared<AdapterHardware>();
        adapter->index = static_cast<unsigned>(index);
        adapter->name = id;
        apply(*adapter, group);
        if (adapter->address.empty())
            fail(group, "Address", "is missing");
        m_world.adapters.push_back(adapter);
    }

    void readDevice(const std::string& group, const std::string& address) {
        if (!isAddress(address))
            fail(group, "", "a device is named by its address");
        auto peer = std::make_shared<PeerDevice>();
        peer->address = address;
        apply(*peer, group);
        m_world.peers.push_back(peer);
    }

    std::string m_file;
    GKeyFile* m_keys;
    World m_world;
};

World readLoaded(const std::string& name, GKeyFile* keys, bool loaded, const ErrorOut& error) {
    if (!loaded)
        throw std::runtime_error(name + ": " + error->message);
    return ScenarioReader(name, keys).read();
}

} // namespace

World loadScenario(const std::string& file) {
    const GlibPtr<GKeyFile> keys(g_key_file_new());
    ErrorOut error;
    const bool loaded =
        g_key_file_load_from_file(keys.get(), file.c_str(), G_KEY_FILE_NONE, error.out()) != FALSE;
    return readLoaded(file, keys.get(), loaded, error);
}

World loadDefaultScenario() {
    const GlibPtr<GKeyFile> keys(g_key_file_new());
    ErrorOut error;
    const bool loaded =
        g_key_file_load_from_data(keys.get(), defaultScenarioText(), static_cast<gsize>(-1),
                                  G_KEY_FILE_NONE, error.out()) != FALSE;
    return readLoaded("default scenario", keys.get(), loaded, error);
}

} // namespace Bluetooth::Sim
