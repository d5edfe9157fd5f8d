// How much each client has open at a time.
#ifndef VELT_HOST_HTTP_PLACES_H
#define VELT_HOST_HTTP_PLACES_H

#include <cstddef>
#include <map>
#include <memory>
#include <mutex>
#include <string>

namespace velt::host {

/// Places of which each holder may have a limited number. Thread-safe; outlives the places.
class Places {
public:
    /// One place, free again with the end of this object.
    class Place {
    public:
        Place(Places& places, std::string holder);
        ~Place();
        Place(const Place&) = delete;
        Place& operator=(const Place&) = delete;

        const std::string& holder() const { return holder_; }

    private:
        Places& places_;
        const std::string holder_;
    };

    explicit Places(std::size_t limit) : limit_(limit) {}

    /// Null when the holder has as many as one may have. The holder "" may have any number.
    std::unique_ptr<Place> take(const std::string& holder);

private:
    const std::size_t limit_;
    std::mutex mutex_;
    std::map<std::string, std::size_t> taken_;
};

} // namespace velt::host

#endif
