// The time lines by keyboard.

const kPanShare = 0.25;

// The span of a service at a place, or the one that is nearest to it.
function spanat(service, place) {
    const at = d3.bisector((span) => span.from).right(service.spans, place) - 1;
    return Math.max(0, at);
}

// Where the keyboard enters: what the first service in sight is now.
function enter(timelines) {
    const {services, lines, rowheight, axis} = timelines;
    const hidden = axis.getBoundingClientRect().bottom - lines.getBoundingClientRect().top;
    const row = Math.max(0, Math.ceil(hidden / rowheight));
    const service = services[Math.min(row, services.length - 1)];
    if (service) {
        timelines.choose(service, spanat(service, timelines.view.to), true);
    }
}

function along(timelines, step) {
    const {service, index} = timelines.active;
    const to = Math.min(service.spans.length - 1, Math.max(0, index + step));
    timelines.choose(service, to, true);
}

function across(timelines, step) {
    const {active: {service, index}, services, view} = timelines;
    const next = services[services.indexOf(service) + step];
    if (next) {
        const {from, to} = service.spans[index];
        const middle = (Math.max(from, view.from) + Math.min(to, view.to)) / 2;
        timelines.choose(next, spanat(next, middle), true);
    }
}

// Zooms to what is chosen, with something around it.
function zoomtochosen(timelines) {
    const {service, index} = timelines.active;
    const {from, to} = service.spans[index];
    const room = Math.max(to - from, kLeastSeconds) * 0.5;
    timelines.view.show(from - room, to + room);
}

const kEverywhere = {
    '+': ({view}) => view.zoom(kZoomStep),
    '=': ({view}) => view.zoom(kZoomStep),
    '-': ({view}) => view.zoom(1 / kZoomStep),
    '_': ({view}) => view.zoom(1 / kZoomStep),
    '0': ({view}) => view.all(),
    'Shift+ArrowLeft': ({view}) => view.pan(-kPanShare),
    'Shift+ArrowRight': ({view}) => view.pan(kPanShare),
};
const kAtChosen = {
    'ArrowLeft': (timelines) => along(timelines, -1),
    'ArrowRight': (timelines) => along(timelines, 1),
    'ArrowUp': (timelines) => across(timelines, -1),
    'ArrowDown': (timelines) => across(timelines, 1),
    'Home': (timelines) => along(timelines, -Infinity),
    'End': (timelines) => along(timelines, Infinity),
    'Enter': zoomtochosen,
    ' ': zoomtochosen,
    'Escape': (timelines) => timelines.unchoose(),
};

// The letters of the browser itself, as with Ctrl, are left to it.
function actionof(event, timelines) {
    if (event.ctrlKey || event.metaKey || event.altKey) {
        return undefined;
    }
    const arrow = event.key.startsWith('Arrow');
    const key = event.shiftKey && arrow ? `Shift+${event.key}` : event.key;
    return kEverywhere[key] ?? (timelines.active ? kAtChosen[key] : arrow ? enter : undefined);
}

function listentokeys(timelines) {
    const {lines} = timelines;
    lines.tabIndex = 0;
    lines.addEventListener('focus', (event) => {
        // A click beside the lines, and leaving what was chosen, are no way in.
        const inside = lines.contains(event.relatedTarget);
        if (!inside && lines.matches(':focus-visible')) {
            enter(timelines);
        }
    });
    lines.addEventListener('keydown', (event) => {
        const action = actionof(event, timelines);
        if (action) {
            event.preventDefault();
            action(timelines);
        }
    });
}
