// SPDX-License-Identifier: Apache-2.0
// Null pointers, sizes and steps below 1, alone and in pairs, for every export: the status is the one that the header
// lists first, and nothing is written. Arguments are made from the prototypes, expectations from the header's words.
#include <algorithm>
#include <cstring>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "harness/call.h"
#include "qorcore.h"
#include "qori.h"

namespace qori::test {
namespace {

constexpr int kMostParameters = 16, kArenaBytes = 16'384;

enum class Type { pointer, pointers, size, scalar };

template <class T>
constexpr Type typeOf = std::is_same_v<T, QorImageSize>               ? Type::size
                        : !std::is_pointer_v<T>                       ? Type::scalar
                        : std::is_pointer_v<std::remove_pointer_t<T>> ? Type::pointers
                                                                      : Type::pointer;

/// An argument of any type.
struct Argument {
    uint8_t* pointer;
    QorImageSize size;
    int32_t scalar;

    template <class T>
    T as() const {
        if constexpr (std::is_pointer_v<T>)
            return reinterpret_cast<T>(pointer);
        else if constexpr (std::is_same_v<T, QorImageSize>)
            return size;
        else if constexpr (std::is_arithmetic_v<T>)
            return static_cast<T>(scalar);
        else
            return T{};
    }
};

using Function = void (*)();

struct Contract {
    const char* name;
    std::string_view parameters;  ///< Names, apart by blanks.
    std::string_view checks;      ///< Statuses with their causes, apart by bars.
    Function function;
    QorResult (*invoke)(Function, const Argument*);
    Type types[kMostParameters];
    int count;
};

template <class... T>
Contract contractOf(const char* name, const char* parameters, const char* checks,
                    QorResult(QORI_CALL* function)(T...)) {
    const auto invoke = [](Function f, const Argument* arguments) {
        return [&]<size_t... i>(std::index_sequence<i...>) {
            return reinterpret_cast<QorResult(QORI_CALL*)(T...)>(f)(arguments[i].template as<T>()...);
        }
        (std::index_sequence_for<T...>{});
    };
    return {name, parameters, checks, reinterpret_cast<Function>(function), invoke, {typeOf<T>...}, sizeof...(T)};
}

std::vector<std::string> split(std::string_view text, char separator) {
    std::vector<std::string> parts;
    for (size_t at = 0; at < text.size();) {
        const size_t end = std::min(text.find(separator, at), text.size());
        parts.emplace_back(text.substr(at, end - at));
        at = end + 1;
    }
    return parts;
}

bool has(const std::string& text, std::string_view word) { return text.find(word) != std::string::npos; }

struct Status {
    std::string_view name;
    QorResult value;
};
constexpr Status kStatuses[] = {{"QOR_ERR_NULL_PTR", QOR_ERR_NULL_PTR},
                                {"QOR_ERR_SIZE", QOR_ERR_SIZE},
                                {"QOR_ERR_ZERO_MASK", QOR_ERR_ZERO_MASK},
                                {"QOR_ERR_ANCHOR", QOR_ERR_ANCHOR},
                                {"QOR_ERR_MASK_SIZE", QOR_ERR_MASK_SIZE},
                                {"QOR_ERR_STEP", QOR_ERR_STEP},
                                {"QOR_WARN_NOTHING_TO_DO", QOR_WARN_NOTHING_TO_DO},
                                {"QOR_ERR_BAD_ARG", QOR_ERR_BAD_ARG},
                                {"QOR_ERR_BAD_RANGE", QOR_ERR_BAD_RANGE},
                                {"QOR_ERR_CONTEXT", QOR_ERR_CONTEXT},
                                {"QOR_ERR_DIV_BY_ZERO", QOR_ERR_DIV_BY_ZERO},
                                {"QOR_ERR_FLIP_AXIS", QOR_ERR_FLIP_AXIS},
                                {"QOR_ERR_HIST_LEVELS", QOR_ERR_HIST_LEVELS},
                                {"QOR_ERR_LUT_LEVELS", QOR_ERR_LUT_LEVELS},
                                {"QOR_ERR_INTERPOLATION", QOR_ERR_INTERPOLATION},
                                {"QOR_ERR_SCALE_RANGE", QOR_ERR_SCALE_RANGE},
                                {"QOR_ERR_UNSUPPORTED_MODE", QOR_ERR_UNSUPPORTED_MODE},
                                {"QOR_ERR_DATA_TYPE", QOR_ERR_DATA_TYPE},
                                {"QOR_ERR_ROUND_MODE", QOR_ERR_ROUND_MODE},
                                {"QOR_ERR_CHANNELS", QOR_ERR_CHANNELS},
                                {"QOR_ERR_WEIGHT", QOR_ERR_WEIGHT},
                                {"QOR_ERR_STEP_ALIGN", QOR_ERR_STEP_ALIGN},
                                {"QOR_ERR_BORDER", QOR_ERR_BORDER},
                                {"QOR_ERR_CHANNELS_UNSUPPORTED", QOR_ERR_CHANNELS_UNSUPPORTED},
                                {"QOR_ERR_ORDER", QOR_ERR_ORDER},
                                {"QOR_ERR_FLAG", QOR_ERR_FLAG},
                                {"QOR_ERR_NO_MEMORY", QOR_ERR_NO_MEMORY},
                                {"QOR_ERR_ALGORITHM", QOR_ERR_ALGORITHM},
                                {"QOR_ERR_DIRECTION", QOR_ERR_DIRECTION},
                                {"QOR_ERR_COEFFS", QOR_ERR_COEFFS}};

enum class Flaw { null, zeroSize, negativeSize, zeroStep };

struct Fault {
    Flaw flaw;
    int parameter;
};

class Caller {
public:
    explicit Caller(const Contract& contract)
        : contract_(contract), names_(split(contract.parameters, ' ')), checks_(split(contract.checks, '|')) {}

    /// Where in the order a fault is found, or behind the last check where nothing is said of it.
    size_t placeOf(Fault fault) const {
        const std::string& name = names_[static_cast<size_t>(fault.parameter)];
        for (size_t i = 0; i < checks_.size(); ++i) {
            const std::string& check = checks_[i];
            const auto is = [&](std::string_view status) {
                return check.find(std::string(status) + ' ') == check.find("QOR_");
            };
            switch (fault.flaw) {
                case Flaw::null:
                    if (is("QOR_ERR_NULL_PTR") && (has(check, "a pointer is null") || names(check, name) ||
                                                   (has(check, "an image is null") && isImage(fault.parameter))))
                        return i;
                    break;
                case Flaw::zeroSize:
                    if (is("QOR_WARN_NOTHING_TO_DO")) return i;
                    [[fallthrough]];
                case Flaw::negativeSize:
                    if (is(name == "maskSize" && hasMaskCheck() ? "QOR_ERR_MASK_SIZE" : "QOR_ERR_SIZE")) return i;
                    break;
                case Flaw::zeroStep:
                    if (is("QOR_ERR_STEP") && (has(check, "a step") || names(check, name))) return i;
                    break;
            }
        }
        return checks_.size();
    }

    /// Every fault of one argument.
    std::vector<Fault> faults() const {
        std::vector<Fault> all;
        for (int i = 0; i < contract_.count; ++i) {
            const Type type = contract_.types[i];
            if (type == Type::size) {
                all.push_back({Flaw::zeroSize, i});
                all.push_back({Flaw::negativeSize, i});
            } else if (type != Type::scalar) {
                all.push_back({Flaw::null, i});
            } else if (isStep(i)) {
                all.push_back({Flaw::zeroStep, i});
            }
        }
        std::erase_if(all, [&](Fault fault) { return placeOf(fault) == checks_.size(); });
        return all;
    }

    /// The place of what sound pointers, sizes and steps lead to: parameters of the operation may still be at fault.
    size_t basePlace() {
        const QorResult result = run({});
        if (result >= 0) return checks_.size();
        for (size_t i = 0; i < checks_.size(); ++i)
            if (statusOf(checks_[i]) == result) return i;
        ADD_FAILURE() << contract_.name << " returned " << result << ", of which its header says nothing";
        return checks_.size();
    }

    void expect(std::initializer_list<Fault> faults, size_t basePlace) {
        size_t first = basePlace;
        for (Fault fault : faults) first = std::min(first, placeOf(fault));
        ASSERT_LT(first, checks_.size());
        std::string what;
        for (Fault fault : faults) what += " " + names_[static_cast<size_t>(fault.parameter)];
        EXPECT_EQ(statusOf(checks_[first]), run(faults)) << contract_.name << " with faults in" << what;
        for (int i = 0; i < contract_.count; ++i)
            ASSERT_TRUE(isUntouched(i)) << contract_.name << " wrote through " << names_[static_cast<size_t>(i)]
                                        << " with faults in" << what;
    }

private:
    static bool names(const std::string& check, const std::string& parameter) {
        return has(check, parameter) && !has(check, "both");
    }
    static QorResult statusOf(const std::string& text) {
        const std::string_view check = std::string_view(text).substr(text.find("QOR_"));
        const std::string_view name = check.substr(0, check.find(' '));
        for (const Status& status : kStatuses)
            if (name == status.name) return status.value;
        ADD_FAILURE() << "unknown status in \"" << text << '"';
        return QOR_OK;
    }
    bool hasMaskCheck() const {
        return std::any_of(checks_.begin(), checks_.end(), [](auto& check) { return has(check, "QOR_ERR_MASK_SIZE"); });
    }
    bool isStep(int i) const {
        const std::string& name = names_[static_cast<size_t>(i)];
        return name.size() > 4 && name.compare(name.size() - 4, 4, "Step") == 0;
    }
    bool isImage(int i) const { return i + 1 < contract_.count && isStep(i + 1); }

    static uint8_t* arena(int i) {
        static uint8_t memory[kMostParameters][kArenaBytes];
        return memory[i];
    }
    static bool isUntouched(int i) {
        static const uint8_t zeros[kArenaBytes] = {};
        return std::memcmp(arena(i), zeros, kArenaBytes) == 0;
    }

    /// Small images in memory of zeros, one arena per pointer; 1 for every number.
    QorResult run(std::initializer_list<Fault> faults) {
        Argument arguments[kMostParameters];
        static uint8_t* entries[kMostParameters][kArenaBytes / 64];
        for (int i = 0; i < contract_.count; ++i) {
            std::memset(arena(i), 0, kArenaBytes);
            for (uint8_t*& entry : entries[i]) entry = arena(i);
            auto* array = reinterpret_cast<uint8_t*>(entries[i]);
            arguments[i] = {contract_.types[i] == Type::pointers ? array : arena(i), {5, 3}, isStep(i) ? 512 : 1};
        }
        for (Fault fault : faults) {
            Argument& argument = arguments[fault.parameter];
            switch (fault.flaw) {
                case Flaw::null: argument.pointer = nullptr; break;
                case Flaw::zeroSize: argument.size = {5, 0}; break;
                case Flaw::negativeSize: argument.size = {-5, 3}; break;
                case Flaw::zeroStep: argument.scalar = 0; break;
            }
        }
        const QorResult result = call(contract_.invoke, contract_.function, static_cast<const Argument*>(arguments));
        if (result == QOR_OK && std::strstr(contract_.name, "InitAlloc") != nullptr)
            qorFree(*reinterpret_cast<void**>(arguments[0].pointer));
        return result;
    }

    const Contract& contract_;
    std::vector<std::string> names_, checks_;
};

/// Without a tag to tell a record by: whatever the pointer leads to is taken for one.
bool trustsItsRecord(std::string_view name) { return name.starts_with("qoriFilterBorder_"); }

const Contract kContracts[] = {
#define QORI_CONTRACT(name, parameters, checks) contractOf(#name, parameters, checks, &name),
#include "contracts/all.inc"
#undef QORI_CONTRACT
};

TEST(Contracts, FirstFaultInTheOrderOfTheHeader) {
    for (const Contract& contract : kContracts) {
        Caller caller(contract);
        const std::vector<Fault> faults = caller.faults();
        const size_t base = trustsItsRecord(contract.name) ? ~size_t{0} : caller.basePlace();
        EXPECT_FALSE(faults.empty()) << contract.name;
        for (size_t i = 0; i < faults.size(); ++i) {
            caller.expect({faults[i]}, base);
            for (size_t j = 0; j < i; ++j)
                if (faults[i].parameter != faults[j].parameter) caller.expect({faults[i], faults[j]}, base);
        }
        if (HasFatalFailure()) return;
    }
}

}  // namespace
}  // namespace qori::test
