// What the encoders of the test plug-ins share: settings that are a dictionary, and an output of text.
#pragma once

#include <string>
#include <utility>

#include "core/encode/qvencoder.h"
#include "core/stream/qvbufstrm.h"

template <class Base>
class TextCoder : public Base {
  public:
    using Base::getParam;

    int setParam(const char* name, const Any& value) override {
        if (!values_.isSet(name)) return Base::setParam(name, value);
        values_.set(name, value);
        return QvStatus::ok;
    }
    void getParam(const char* name, Any& value) const override {
        if (values_.isSet(name))
            value = values_.get(name);
        else if (ranges_.isSet(name))
            value = ranges_.get(name);
        else
            Base::getParam(name, value);
    }
    void store(AnyDict& state) const override {
        state = values_;
        state.set("name", this->name());
    }
    int restore(const AnyDict& state) override {
        for (const auto [key, value] : state)
            if (values_.isSet(key)) values_.set(key, *value);
        return QvStatus::ok;
    }
    int open() override { return QvStatus::ok; }
    int close() override { return QvStatus::ok; }

  protected:
    TextCoder(AnyDict values, AnyDict ranges) : values_(std::move(values)), ranges_(std::move(ranges)) {}

    int write(std::string line) {
        auto* const out = this->outStream()->input();
        const auto size = static_cast<unsigned>(line.size());
        return out->copybytes(out, reinterpret_cast<unsigned char*>(line.data()), size) == size
                   ? QvStatus::ok
                   : this->setError(QvStatus::failed, "The output takes no more");
    }

    AnyDict values_;  // the settings by name
    AnyDict ranges_;  // what can be asked, but not set
};
