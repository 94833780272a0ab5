#include "qv/zil/osdep/IConvDescriptor.h"

#include <gtest/gtest.h>

#include <clocale>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "qv/zil/Exceptions.h"
#include "qv/zil/osdep/IConv.h"

namespace qv {
namespace zil {
namespace osdep {
namespace {

// Converts wide text with a borrowed descriptor; `flush` ends in the initial shift state.
std::string Convert(IConvDescriptor& descriptor, const std::wstring& text, bool flush) {
    char out[64];
    char* in = reinterpret_cast<char*>(const_cast<wchar_t*>(text.data()));
    size_t inLeft = text.size() * sizeof(wchar_t);
    char* cursor = out;
    size_t outLeft = sizeof out;
    EXPECT_NE(static_cast<size_t>(-1), iconv(descriptor.Get(), &in, &inLeft, &cursor, &outLeft));
    if (flush) {
        iconv(descriptor.Get(), nullptr, nullptr, &cursor, &outLeft);
    }
    return std::string(out, cursor);
}

std::string ToNarrow(const std::wstring& text, const char* charset) {
    char out[64];
    char* reached = out + sizeof out;
    IConv::WideToNarrow(text.data(), text.data() + text.size(), out, reached, charset);
    return std::string(out, reached);
}

TEST(IConvDescriptorTest, AReturnedDescriptorIsLentAgainInItsInitialShiftState) {
    {
        IConvDescriptor first("ISO-2022-JP", "WCHAR_T");
        // Left shifted into JIS X 0208 on purpose.
        EXPECT_EQ("\x1B$BF|", Convert(first, std::wstring(1, wchar_t(0x65E5)), false));
    }
    IConvDescriptor second("ISO-2022-JP", "WCHAR_T");
    // A descriptor still shifted would first switch back to ASCII: "\x1B(BA".
    EXPECT_EQ("A", Convert(second, L"A", true));
}

TEST(IConvDescriptorTest, OneDescriptorServesOneOwnerAndTheCacheStaysSmall) {
    std::vector<std::unique_ptr<IConvDescriptor>> held;
    for (int i = 0; i < 12; ++i) {
        held.push_back(std::make_unique<IConvDescriptor>("UTF-16LE", "WCHAR_T"));
    }
    for (size_t i = 0; i < held.size(); ++i) {
        for (size_t j = i + 1; j < held.size(); ++j) {
            ASSERT_NE(held[i]->Get(), held[j]->Get());
        }
    }
    held.clear();
    EXPECT_LE(IConvDescriptor::CachedCount(), 8u);
    // Taken from the cache again, and still converting correctly.
    IConvDescriptor again("UTF-16LE", "WCHAR_T");
    EXPECT_EQ(std::string("h\0i\0", 4), Convert(again, L"hi", true));
}

TEST(IConvDescriptorTest, UnknownSetsThrowAndAreNotCached) {
    const unsigned before = IConvDescriptor::CachedCount();
    EXPECT_THROW(IConvDescriptor("NO-SUCH-SET", "WCHAR_T"), exception::InvalidLocale);
    EXPECT_EQ(before, IConvDescriptor::CachedCount());
}

TEST(IConvDescriptorTest, LongNamesWorkWithoutTheCache) {
    // Longer than a cached name may be; iconv ignores the unknown suffix after "//".
    const std::string name = "UTF-8//" + std::string(40, 'X');
    EXPECT_EQ("\xC3\xA9", ToNarrow(std::wstring(1, wchar_t(0xE9)), name.c_str()));
}

TEST(IConvDescriptorTest, TheLocalesSetIsResolvedAtEachConversion) {
    const std::wstring text = L"a\u00E9";
    EXPECT_EQ("a?", ToNarrow(text, ""));
    if (std::setlocale(LC_ALL, "C.UTF-8") == nullptr) {
        GTEST_SKIP() << "no C.UTF-8 locale here";
    }
    const std::string utf8 = ToNarrow(text, "");
    std::setlocale(LC_ALL, "C");
    EXPECT_EQ("a\xC3\xA9", utf8);
    // The UTF-8 descriptor is cached now; the "C" locale must not get it.
    EXPECT_EQ("a?", ToNarrow(text, ""));
}

TEST(IConvDescriptorTest, ThreadsConvertAtOnceWithoutSharingADescriptor) {
    std::vector<std::thread> threads;
    std::vector<int> failures(6, 0);
    for (size_t t = 0; t < failures.size(); ++t) {
        threads.emplace_back([t, &failures] {
            const std::wstring text = L"thread " + std::to_wstring(t) + L" \u20AC";
            const std::string expected = "thread " + std::to_string(t) + " \xE2\x82\xAC";
            for (int i = 0; i < 300; ++i) {
                failures[t] += ToNarrow(text, "UTF-8") == expected ? 0 : 1;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(std::vector<int>(failures.size(), 0), failures);
}

}  // namespace
}  // namespace osdep
}  // namespace zil
}  // namespace qv
