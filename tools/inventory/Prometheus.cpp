#include "inventory/Prometheus.h"

#include <cmath>
#include <cstdio>
#include <map>
#include <set>

#include "IC/MutableNode.h"
#include "inventory/Inventory.h"
#include "inventory/PropertyNames.h"

namespace inventory {

namespace {

// Node types of the components the metrics describe.
enum NodeType : unsigned int {
    CHASSIS = 1,
    FIRMWARE = 3,
    PROCESSOR = 4,
    MANAGEMENT_INTERFACE = 15,
    MEMORY_DEVICE = 19,
    PROCESSOR_CACHE = 31,
    COMPUTER_SYSTEM = 40,
    PLANAR = 41,
    SYSTEM_SLOT = 62,
};

// The management interface's SMBIOS version (306); the computer system's
// clock and time-zone offset (126, 127), which change by themselves.
unsigned int const SMBIOS_VERSION = 306;
unsigned int const CURRENT_TIME = 126;
unsigned int const TIME_ZONE = 127;

// One kind of component: its info metric, the properties whose texts
// identify one component among its siblings (they label its gauges too),
// and the further properties its info metric shows.
struct Component {
    char const* metric;
    char const* help;
    unsigned int nodeType;
    std::vector<unsigned int> keys;
    std::vector<unsigned int> texts;
};

std::vector<Component> const kComponents = {
    {"smbios_system_info",
     "The computer system: SMBIOS version, maker, product, serial number, UUID",
     COMPUTER_SYSTEM,
     {},
     {36, 39, 307, 50, 64, 52, 20}},
    {"smbios_chassis_info",
     "A chassis: maker, type, version, serial number, asset tag",
     CHASSIS,
     {},
     {36, 108, 307, 50, 2}},
    {"smbios_baseboard_info",
     "The baseboard: maker, product, serial number, asset tag",
     PLANAR,
     {},
     {36, 39, 50, 2}},
    {"smbios_firmware_info",
     "A firmware image: name, vendor, version, release date",
     FIRMWARE,
     {108},
     {36, 307, 164}},
    {"smbios_processor_info",
     "An installed processor: socket, maker, model",
     PROCESSOR,
     {53},
     {36, 307, 45}},
    {"smbios_processor_cache_info",
     "A processor cache: designation and level",
     PROCESSOR_CACHE,
     {53},
     {30}},
    {"smbios_memory_device_info",
     "An installed memory device: locator, maker, part number, serial number, type, form factor",
     MEMORY_DEVICE,
     {68},
     {36, 45, 50, 295, 85}},
    {"smbios_slot_info",
     "A system slot: designation, type, slot id",
     SYSTEM_SLOT,
     {108},
     {128, 270}},
};

// A number of a component in base units: the property's value times factor.
struct Gauge {
    char const* metric;
    char const* help;
    unsigned int nodeType;
    unsigned int property;
    double factor;
};

Gauge const kGauges[] = {
    {"smbios_processor_max_speed_hertz", "The processor's maximum speed", PROCESSOR, 38, 1e6},
    {"smbios_processor_current_speed_hertz", "The processor's speed at boot", PROCESSOR, 80, 1e6},
    {"smbios_processor_external_clock_hertz", "The processor's external clock", PROCESSOR, 19, 1e6},
    {"smbios_processor_cores", "Cores of the processor", PROCESSOR, 190, 1},
    {"smbios_processor_enabled_cores", "Enabled cores of the processor", PROCESSOR, 189, 1},
    {"smbios_processor_threads", "Threads of the processor", PROCESSOR, 87, 1},
    {"smbios_cache_size_bytes", "The installed size of the processor cache", PROCESSOR_CACHE, 73,
     1024},
    {"smbios_cache_max_size_bytes", "The largest size the processor cache can have",
     PROCESSOR_CACHE, 112, 1024},
    {"smbios_memory_device_size_bytes", "The size of the installed memory device", MEMORY_DEVICE,
     112, 1024},
    {"smbios_memory_device_speed_megahertz", "The memory device's speed", MEMORY_DEVICE, 57, 1},
};

// What the metrics need of one node.
struct NodeView {
    IC::Node const* node = nullptr;
    unsigned int type = 0;
    NodeView const* parent = nullptr;
};

std::vector<NodeView> viewNodes(std::vector<IC::Node*> const& nodes) {
    std::vector<NodeView> views;
    views.reserve(nodes.size());
    std::map<unsigned int, size_t> byId;
    for (IC::Node const* node : nodes) {
        if (node == nullptr) {
            continue;
        }
        NodeView view;
        view.node = node;
        if (auto const* mutableNode = dynamic_cast<IC::MutableNode const*>(node)) {
            view.type = mutableNode->getNodeType();
        }
        byId.emplace(node->getNodeId(), views.size());
        views.push_back(view);
    }
    for (NodeView& view : views) {
        auto const parent = byId.find(view.node->getLinkedId());
        if (parent != byId.end() && &views[parent->second] != &view) {
            view.parent = &views[parent->second];
        }
    }
    return views;
}

// The value as a label shows it: texts as they are, enumerated values by
// their meaning where it is known, numbers in decimal.
std::string valueText(unsigned int nodeType, unsigned int id, IC::PropertyValue const& value) {
    switch (value.getKind()) {
        case IC::PropertyValue::STRING:
            return value.getString();
        case IC::PropertyValue::ENUM: {
            std::int64_t const number = value.getEnum().getValue();
            PropertyInfo const* info = findProperty(nodeType, id);
            char const* meaning = info != nullptr && number >= 0 && number <= 0xFFFFFFFF
                                      ? valueMeaning(*info, static_cast<std::uint32_t>(number))
                                      : nullptr;
            return meaning != nullptr ? meaning : std::to_string(number);
        }
        case IC::PropertyValue::NUMBER:
            return value.getNumber().toString();
        default:
            return formatValue(value);
    }
}

bool readProperty(IC::Node const& node, unsigned int id, IC::PropertyValue& value) {
    return node.getProperty(id, value).getStatus() == 0;
}

std::string propertyText(NodeView const& view, unsigned int id) {
    IC::PropertyValue value;
    return readProperty(*view.node, id, value) ? valueText(view.type, id, value) : std::string();
}

using Labels = std::vector<std::pair<std::string, std::string>>;

void addPropertyLabels(Labels& labels, NodeView const& view, std::vector<unsigned int> const& ids,
                       std::string const& prefix) {
    for (unsigned int id : ids) {
        PropertyInfo const* info = findProperty(view.type, id);
        labels.emplace_back(prefix + labelName(info != nullptr ? info->name : nullptr, id),
                            propertyText(view, id));
    }
}

Component const* componentOf(unsigned int nodeType) {
    for (Component const& component : kComponents) {
        if (component.nodeType == nodeType) {
            return &component;
        }
    }
    return nullptr;
}

// The labels that tell a component from its siblings: its own keys, and its
// parent component's keys (a cache's processor) prefixed with the parent's
// kind.
Labels identity(NodeView const& view) {
    Labels labels;
    if (view.parent != nullptr) {
        Component const* parent = componentOf(view.parent->type);
        if (parent != nullptr && !parent->keys.empty()) {
            std::string const kind = nodeTypeName(view.parent->type);
            addPropertyLabels(labels, *view.parent, parent->keys,
                              labelName(kind.c_str(), view.parent->type) + "_");
        }
    }
    Component const* own = componentOf(view.type);
    if (own != nullptr) {
        addPropertyLabels(labels, view, own->keys, "");
    }
    return labels;
}

// The samples of one metric, written after its HELP and TYPE lines. A
// label set that stands twice gets an "occurrence" label, so that every
// series is one of its own.
class Metric {
public:
    Metric(char const* name, char const* help, char const* type)
        : name_(name), help_(help), type_(type) {}

    void add(Labels labels, std::string const& value) {
        std::string text = render(labels);
        unsigned int& seen = seen_[text];
        if (++seen > 1) {
            labels.emplace_back("occurrence", std::to_string(seen));
            text = render(labels);
        }
        samples_ += name_ + text + " " + value + "\n";
    }

    void writeTo(std::string& out) const {
        if (samples_.empty()) {
            return;
        }
        out += "# HELP " + name_ + " " + help_ + "\n";
        out += "# TYPE " + name_ + " " + type_ + "\n";
        out += samples_;
    }

private:
    static std::string render(Labels const& labels) {
        if (labels.empty()) {
            return std::string();
        }
        std::string text = "{";
        for (auto const& label : labels) {
            text += (text.size() > 1 ? "," : "") + label.first + "=\"" + labelValue(label.second) +
                    "\"";
        }
        return text + "}";
    }

    std::string name_;
    std::string help_;
    std::string type_;
    std::map<std::string, unsigned int> seen_;
    std::string samples_;
};

// A sample value: whole numbers without a fraction, others as the shortest
// decimal that reads back the same.
std::string sampleValue(double value) {
    char buffer[32];
    if (std::floor(value) == value && std::fabs(value) < 1e15) {
        std::snprintf(buffer, sizeof buffer, "%.0f", value);
    } else {
        std::snprintf(buffer, sizeof buffer, "%.17g", value);
    }
    return buffer;
}

bool numberOf(IC::PropertyValue const& value, double& number) {
    if (value.getKind() == IC::PropertyValue::NUMBER) {
        IC::Number const& n = value.getNumber();
        if (n.getKind() == IC::Number::UNSIGNED) {
            number = n.getUnsigned();
            return true;
        }
        if (n.getKind() == IC::Number::DOUBLE) {
            number = n.getDouble();
            return true;
        }
    }
    return false;
}

std::string systemVersion(std::vector<NodeView> const& views) {
    for (NodeView const& view : views) {
        if (view.type == MANAGEMENT_INTERFACE) {
            std::string const version = propertyText(view, SMBIOS_VERSION);
            if (!version.empty()) {
                return version;
            }
        }
    }
    return std::string();
}

void addInfo(Metric& metric, Component const& component, NodeView const& view,
             std::string const& smbiosVersion) {
    Labels labels = identity(view);
    if (component.nodeType == COMPUTER_SYSTEM) {
        labels.emplace_back("smbios_version", smbiosVersion);
    }
    addPropertyLabels(labels, view, component.texts, "");
    metric.add(std::move(labels), "1");
}

void addGauge(Metric& metric, Gauge const& gauge, NodeView const& view) {
    IC::PropertyValue value;
    double number = 0;
    if (readProperty(*view.node, gauge.property, value) && numberOf(value, number)) {
        metric.add(identity(view), sampleValue(number * gauge.factor));
    }
}

void addStatus(Metric& metric, NodeView const& view) {
    Labels labels;
    labels.emplace_back("node", std::to_string(view.node->getNodeId()));
    labels.emplace_back("type", nodeTypeName(view.type));
    labels.emplace_back("description", view.node->getDescription());
    metric.add(std::move(labels), std::to_string(view.node->getStatus()));
}

// FNV-1a, 64 bits.
class Hash {
public:
    void add(std::string const& text) {
        for (unsigned char c : text) {
            value_ = (value_ ^ c) * 0x100000001B3ull;
        }
        value_ = (value_ ^ 0xFFu) * 0x100000001B3ull;  // ends the field
    }
    void add(std::uint64_t number) { add(std::to_string(number)); }
    std::uint64_t value() const { return value_; }

private:
    std::uint64_t value_ = 0xCBF29CE484222325ull;
};

void hashValue(Hash& hash, IC::PropertyValue const& value) {
    hash.add(static_cast<std::uint64_t>(value.getKind()));
    switch (value.getKind()) {
        case IC::PropertyValue::STRING:
            hash.add(value.getString());
            break;
        case IC::PropertyValue::NUMBER:
            hash.add(value.getNumber().toString());
            break;
        case IC::PropertyValue::NUMBERS:
            for (IC::Number const& number : value.getNumbers()) {
                hash.add(number.toString());
            }
            break;
        case IC::PropertyValue::STRINGS:
            for (std::string const& text : value.getStrings()) {
                hash.add(text);
            }
            break;
        default:
            hash.add(formatValue(value));
            break;
    }
}

}  // namespace

std::string labelName(char const* propertyName, unsigned int id) {
    std::string name;
    bool gap = false;
    for (char const* p = propertyName; p != nullptr && *p != '\0'; ++p) {
        char const c = *p;
        bool const upper = c >= 'A' && c <= 'Z';
        bool const lower = c >= 'a' && c <= 'z';
        bool const digit = c >= '0' && c <= '9';
        if (!upper && !lower && !digit) {
            gap = true;
            continue;
        }
        // Words joined by one underscore; a name never starts with a digit.
        if ((gap && !name.empty()) || (digit && name.empty())) {
            name += '_';
        }
        gap = false;
        name += upper ? static_cast<char>(c - 'A' + 'a') : c;
    }
    return name.empty() ? "property_" + std::to_string(id) : name;
}

std::string labelValue(std::string const& text) {
    std::string out;
    for (char c : latin1ToUtf8(text)) {
        switch (c) {
            case '\\':
                out += "\\\\";
                break;
            case '"':
                out += "\\\"";
                break;
            case '\n':
                out += "\\n";
                break;
            default:
                out += c;
        }
    }
    return out;
}

std::uint64_t inventoryFingerprint(std::vector<IC::Node*> const& nodes) {
    Hash hash;
    for (NodeView const& view : viewNodes(nodes)) {
        IC::Node const& node = *view.node;
        hash.add(node.getNodeId());
        hash.add(node.getLinkedId());
        hash.add(view.type);
        hash.add(node.getIndex());
        hash.add(node.getStatus());
        hash.add(node.getDescription());
        for (auto const& property : node.getProperties()) {
            if (view.type == COMPUTER_SYSTEM &&
                (property.first == CURRENT_TIME || property.first == TIME_ZONE)) {
                continue;
            }
            hash.add(property.first);
            hashValue(hash, property.second);
        }
    }
    return hash.value() & ((std::uint64_t(1) << 53) - 1);
}

std::string renderPrometheus(std::vector<IC::Node*> const& nodes) {
    std::vector<NodeView> const views = viewNodes(nodes);
    std::string const version = systemVersion(views);
    std::string out;
    for (Component const& component : kComponents) {
        Metric metric(component.metric, component.help, "gauge");
        for (NodeView const& view : views) {
            if (view.type == component.nodeType) {
                addInfo(metric, component, view, version);
            }
        }
        metric.writeTo(out);
    }
    for (Gauge const& gauge : kGauges) {
        Metric metric(gauge.metric, gauge.help, "gauge");
        for (NodeView const& view : views) {
            if (view.type == gauge.nodeType) {
                addGauge(metric, gauge, view);
            }
        }
        metric.writeTo(out);
    }
    Metric status("smbios_node_status", "The status the plug-in gives each node of the inventory",
                  "gauge");
    for (NodeView const& view : views) {
        addStatus(status, view);
    }
    status.writeTo(out);
    Metric fingerprint("smbios_inventory_fingerprint",
                       "A hash of the whole inventory but the clock; it changes when the "
                       "hardware or firmware it describes changes",
                       "gauge");
    fingerprint.add(Labels(), std::to_string(inventoryFingerprint(nodes)));
    fingerprint.writeTo(out);
    return out;
}

}  // namespace inventory
