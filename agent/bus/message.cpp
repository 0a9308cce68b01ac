#include "agent/bus/message.h"

#include <cstring>

#include "agent/bus/text.h"

namespace cvagent::bus {

namespace {

std::string orEmpty(const char* text) {
    return text != nullptr ? text : "";
}

void check(int result, const char* what) {
    if (result < 0) {
        throw Error::ofErrno(what, result);
    }
}

}  // namespace

Error Error::ofErrno(const std::string& what, int error) {
    return {kFailed, what + ": " + std::strerror(error < 0 ? -error : error)};
}

Message Message::adopt(sd_bus_message* message) {
    Message made;
    made.message_ =
        std::shared_ptr<sd_bus_message>(message, [](sd_bus_message* it) { sd_bus_message_unref(it); });
    return made;
}

Message Message::share(sd_bus_message* message) {
    return adopt(sd_bus_message_ref(message));
}

std::string Message::sender() const {
    return orEmpty(sd_bus_message_get_sender(get()));
}

std::string Message::path() const {
    return orEmpty(sd_bus_message_get_path(get()));
}

std::string Message::interface() const {
    return orEmpty(sd_bus_message_get_interface(get()));
}

std::string Message::member() const {
    return orEmpty(sd_bus_message_get_member(get()));
}

std::string Message::signature() const {
    return orEmpty(sd_bus_message_get_signature(get(), 1));
}

bool Message::isMethodCall() const {
    return sd_bus_message_is_method_call(get(), nullptr, nullptr) > 0;
}

bool Message::isError() const {
    return sd_bus_message_is_method_error(get(), nullptr) > 0;
}

Error Message::error() const {
    const sd_bus_error* error = sd_bus_message_get_error(get());
    return error == nullptr ? Error(kFailed, "") : Error(orEmpty(error->name), orEmpty(error->message));
}

bool Message::wantsNoReply() const {
    return sd_bus_message_get_expect_reply(get()) == 0;
}

bool Message::allowsInteraction() const {
    return sd_bus_message_get_allow_interactive_authorization(get()) > 0;
}

void Message::allowInteraction() {
    check(sd_bus_message_set_allow_interactive_authorization(get(), 1), "cannot let the user be asked");
}

void Message::startNobody() {
    check(sd_bus_message_set_auto_start(get(), 0), "cannot leave the service as it is");
}

Message Message::reply() const {
    sd_bus_message* made = nullptr;
    check(sd_bus_message_new_method_return(get(), &made), "cannot make an answer");
    return adopt(made);
}

Message Message::errorReply(const std::string& name, const std::string& text) const {
    const std::string message = shortText(text);
    const sd_bus_error error{name.c_str(), message.c_str(), 0};
    sd_bus_message* made = nullptr;
    check(sd_bus_message_new_method_error(get(), &made, &error), "cannot make an answer");
    return adopt(made);
}

}  // namespace cvagent::bus
