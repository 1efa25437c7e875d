// SPDX-License-Identifier: LGPL-2.1-or-later
#include "serving/session/temporary_folder.h"

#include "serving/bus/glib_ptr.h"

#include <glib/gstdio.h>

#include <stdexcept>

namespace Bluetooth::Serving {

TemporaryFolder::TemporaryFolder(const std::string& name) {
    ErrorOut error;
    const GlibPtr<char> made(g_dir_make_tmp((name + "-XXXXXX").c_str(), error.out()));
    if (!made)
        throw std::runtime_error(error->message);
    m_path = made.get();
}

TemporaryFolder::~TemporaryFolder() {
    if (GDir* dir = g_dir_open(m_path.c_str(), 0, nullptr)) {
        while (const char* name = g_dir_read_name(dir))
            g_unlink((m_path + "/" + name).c_str());
        g_dir_close(dir);
    }
    g_rmdir(m_path.c_str());
}

} // namespace Bluetooth::Serving
