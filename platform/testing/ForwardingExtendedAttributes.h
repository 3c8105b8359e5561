#pragma once

#include "platform/services/ExtendedAttributes.h"

namespace marrowdale {

// Hands every call on to another service; derive and override what the test is about.
class ForwardingExtendedAttributes : public ExtendedAttributes {
  public:
    explicit ForwardingExtendedAttributes(ExtendedAttributes& target) : target_(target) {}

    Expected<std::size_t> size(const URL& url, std::string_view name) override {
        return target_.size(url, name);
    }
    Expected<Data> read(const URL& url, std::string_view name, std::size_t room) override {
        return target_.read(url, name, room);
    }
    Expected<void> set(const OpenFile& file, std::string_view name, const Data& value) override {
        return target_.set(file, name, value);
    }
    Expected<void> remove(const OpenFile& file, std::string_view name) override {
        return target_.remove(file, name);
    }

  private:
    ExtendedAttributes& target_;
};

}  // namespace marrowdale
