#ifndef QUELTA_UTIL_INTERNAL_NEVERDESTROYED_H_
#define QUELTA_UTIL_INTERNAL_NEVERDESTROYED_H_

// A static value whose destructor never runs, so that code which runs during exit can still use it.
//
//     static NeverDestroyed<Logger> logger("Logger");
//     logger.value.warn("text");
// As safe from several threads as the value itself.

template <class Value>
union NeverDestroyed {
    Value value;

    template <class... Args>
    constexpr explicit NeverDestroyed(Args... args) : value(args...) {}
    ~NeverDestroyed() {}
    NeverDestroyed(const NeverDestroyed&) = delete;
    NeverDestroyed& operator=(const NeverDestroyed&) = delete;
};

#endif  // QUELTA_UTIL_INTERNAL_NEVERDESTROYED_H_
