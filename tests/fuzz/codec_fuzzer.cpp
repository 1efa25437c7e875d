// SPDX-License-Identifier: LGPL-2.1-or-later
// The text form of dictionaries: what was parsed once is formatted and parsed without change.

#include <bluetooth/dict_codec.h>

#include <fuzzer/FuzzedDataProvider.h>

#include <cstdlib>
#include <memory>

using namespace Bluetooth;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    FuzzedDataProvider bytes(data, size);
    const std::string separators = bytes.ConsumeRandomLengthString(3);
    const std::string text = bytes.ConsumeRemainingBytesAsString();
    const std::unique_ptr<DictEntry> entry(stringToEntry(text));
    if ((entry != nullptr) != (text.find(':') != std::string::npos))
        abort();
    const std::unique_ptr<Dict> first(stringDivideToDict(text, separators));
    if (!first)
        return 0;
    if (first->empty() || find(first.get(), first->front().first.c_str()).size() > text.size())
        abort();
    dictToString(*first);
    // The formatter writes these two itself.
    if (separators.find_first_of(": ") != std::string::npos)
        return 0;
    const std::string again = dictConquerToString(*first, separators.substr(0, 1));
    const std::unique_ptr<Dict> second(stringDivideToDict(again, separators));
    if (!second || *second != *first ||
        dictConquerToString(*second, separators.substr(0, 1)) != again)
        abort();
    return 0;
}
