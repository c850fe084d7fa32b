// String calls of the platform. The bounded calls (_s) never write past the
// given buffer length and always terminate a buffer of at least one byte;
// number parsing follows the "C" locale whatever locale the process has set,
// so "0.5" reads the same on every device.
#include <KD/kd.h>
#include <locale.h>
#include <stdio.h>
#include <stdlib.h>

#include <cerrno>
#include <climits>
#include <cstring>

namespace {

// Created once and kept for the life of the process: the parsers use it from
// any thread, and a locale object is only read after creation.
locale_t cLocale() {
    static const locale_t locale = newlocale(LC_ALL_MASK, "C", static_cast<locale_t>(nullptr));
    return locale;
}

bool startsWithMinus(const KDchar* s) {
    while (*s == ' ' || (*s >= '\t' && *s <= '\r')) {
        ++s;
    }
    return *s == '-';
}

}  // namespace

KDsize kdStrlen(const KDchar* str) {
    return std::strlen(str);
}

KDsize kdStrnlen(const KDchar* str, KDsize maxlen) {
    return strnlen(str, maxlen);
}

KDint kdStrcmp(const KDchar* str1, const KDchar* str2) {
    return std::strcmp(str1, str2);
}

KDint kdStrncmp(const KDchar* str1, const KDchar* str2, KDsize maxlen) {
    return std::strncmp(str1, str2, maxlen);
}

KDchar* kdStrchr(const KDchar* str, KDint ch) {
    return const_cast<KDchar*>(std::strchr(str, ch));
}

// Copies what fits; returns 0 when all of src fitted, KD_EINVAL when the copy
// was cut short (the buffer then holds the terminated beginning of src) or
// when there is no buffer.
KDint kdStrcpy_s(KDchar* buf, KDsize buflen, const KDchar* src) {
    if (buf == nullptr || buflen == 0) {
        return KD_EINVAL;
    }
    if (src == nullptr) {
        buf[0] = '\0';
        return KD_EINVAL;
    }
    const KDsize length = strnlen(src, buflen);
    const bool fits = length < buflen;
    const KDsize copied = fits ? length : buflen - 1;
    std::memmove(buf, src, copied);
    buf[copied] = '\0';
    return fits ? 0 : KD_EINVAL;
}

// Appends at most srcmaxlen characters of src; returns 0 when they all
// fitted, KD_EINVAL when the result was cut short or buf held no terminated
// string within buflen (it is then terminated at its last byte).
KDint kdStrncat_s(KDchar* buf, KDsize buflen, const KDchar* src, KDsize srcmaxlen) {
    if (buf == nullptr || buflen == 0) {
        return KD_EINVAL;
    }
    const KDsize used = strnlen(buf, buflen);
    if (used == buflen) {
        buf[buflen - 1] = '\0';
        return KD_EINVAL;
    }
    if (src == nullptr) {
        return KD_EINVAL;
    }
    const KDsize wanted = strnlen(src, srcmaxlen);
    const KDsize room = buflen - 1 - used;
    const KDsize copied = wanted < room ? wanted : room;
    std::memmove(buf + used, src, copied);
    buf[used + copied] = '\0';
    return copied == wanted ? 0 : KD_EINVAL;
}

KDint kdSprintf_s(KDchar* buf, KDsize buflen, const KDchar* format, ...) {
    va_list ap;
    va_start(ap, format);
    const KDint length = kdVsprintf_s(buf, buflen, format, ap);
    va_end(ap);
    return length;
}

KDint kdVsprintf_s(KDchar* buf, KDsize buflen, const KDchar* format, va_list ap) {
    if (buf == nullptr) {
        buflen = 0;
    }
    const int length = vsnprintf(buf, buflen, format, ap);
    // A failed format may leave the buffer half written.
    if (length < 0 && buflen > 0) {
        buf[0] = '\0';
    }
    return length;
}

KDfloat32 kdStrtof(const KDchar* s, KDchar** endptr) {
    return strtof_l(s, endptr, cLocale());
}

// Saturates at the 32-bit limits, as strtol does on the 32-bit devices the
// library runs on.
KDint kdStrtol(const KDchar* s, KDchar** endptr, KDint base) {
    const long value = strtol_l(s, endptr, base, cLocale());
    if (value > INT_MAX) {
        return INT_MAX;
    }
    if (value < INT_MIN) {
        return INT_MIN;
    }
    return static_cast<KDint>(value);
}

// Behaves as strtoul with a 32-bit unsigned long: a value beyond 32 bits
// saturates, and a negative one wraps modulo 2^32 ("-1" is 0xFFFFFFFF).
KDuint kdStrtoul(const KDchar* s, KDchar** endptr, KDint base) {
    errno = 0;
    const unsigned long value = strtoul_l(s, endptr, base, cLocale());
    const bool overflowed = errno == ERANGE;
    if (!startsWithMinus(s)) {
        return overflowed || value > UINT_MAX ? UINT_MAX : static_cast<KDuint>(value);
    }
    // strtoul parsed the magnitude and negated it modulo 2^64.
    const unsigned long magnitude = 0ul - value;
    if (overflowed || magnitude > UINT_MAX) {
        return UINT_MAX;
    }
    return 0u - static_cast<KDuint>(magnitude);
}
