#pragma once

#include <limits>
#include <string>

#include "platform/foundation/PropertyList.h"

namespace marrowdale {

// Lists that several tests use.
struct PropertyListExamples {
    // Every kind of value, at several depths, with shared strings.
    [[nodiscard]] static PropertyList nontrivial() {
        PropertyListDictionary inner;
        inner.emplace("label", PropertyList(std::string("\xC3\xA4 \xF0\x9F\x98\x80")));
        inner.emplace("color", PropertyList(std::int64_t{6}));
        PropertyListArray array;
        array.emplace_back(inner);
        array.emplace_back(inner);
        array.emplace_back(PropertyListArray{PropertyList(std::string("label"))});
        array.emplace_back(std::numeric_limits<std::uint64_t>::max());
        array.emplace_back(std::int64_t{-300});
        array.emplace_back(std::int64_t{100'000});
        PropertyListDictionary root;
        root.emplace("array", PropertyList(std::move(array)));
        root.emplace("data", PropertyList(Data::fromText("some bytes that need a long count")));
        root.emplace("date", PropertyList(Date{1'769'903'999, 500'000'000}));
        root.emplace("real", PropertyList(-0.25));
        root.emplace("true", PropertyList(true));
        root.emplace("false", PropertyList(false));
        root.emplace("empty", PropertyList(PropertyListDictionary()));
        return PropertyList(std::move(root));
    }
};

}  // namespace marrowdale
